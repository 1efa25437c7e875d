// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_DEVICE_LIST_H
#define KESBLUETOOTH_DEVICE_LIST_H

#include <bluetooth/export.h>

#include <vector>

namespace Bluetooth {

class Device;

/// Devices in the daemon's order. The list owns them and deletes them with itself: to keep one, set
/// its element to null or take it out of the list.
///
/// An element is null when the daemon left the bus while the list was being made.
class KESBLUETOOTH_API DeviceList : public std::vector<Device*> {
public:
    DeviceList() = default;
    DeviceList(const DeviceList&) = delete;
    DeviceList& operator=(const DeviceList&) = delete;
    virtual ~DeviceList();
};

} // namespace Bluetooth

#endif
