// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/adapter_list.h>

#include <bluetooth/adapter.h>

namespace Bluetooth {

AdapterList::~AdapterList() {
    for (const Adapter* adapter : *this)
        delete adapter;
}

} // namespace Bluetooth
