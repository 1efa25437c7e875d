#include <bluetooth/adapter_list.h>

#include <bluetooth/adapter.h>

namespace Bluetooth {

AdapterList::~AdapterList() {
    for (const Adapter* adapter : *this)
        delete adapter;
}

} // namespace Bluetooth
