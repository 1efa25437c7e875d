// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/device_list.h>

#include <bluetooth/device.h>

namespace Bluetooth {

DeviceList::~DeviceList() {
    for (const Device* device : *this)
        delete device;
}

} // namespace Bluetooth
