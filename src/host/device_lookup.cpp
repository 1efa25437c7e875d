// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/device_lookup.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>

#include <dbus/dbus.h>

#include <memory>

namespace Bluetooth {

namespace {

bool isDeniedByDaemon(const std::string& errorName) {
    return errorName == "org.bluez.Error.DoesNotExist" ||
           errorName == "org.bluez.Error.InvalidArguments";
}

} // namespace

Lookup appendDevice(Adapter& adapter, const std::string& address, DeviceList& devices) {
    if (address.find('\0') != std::string::npos)
        return Lookup::Unknown;
    std::unique_ptr<Device> device(adapter.findDevice(address.c_str(), true));
    if (device) {
        devices.push_back(device.get());
        static_cast<void>(device.release());
        return Lookup::Found;
    }
    const bool canBeSent = dbus_validate_utf8(address.c_str(), nullptr);
    return !canBeSent || isDeniedByDaemon(adapter.getErrorName()) ? Lookup::Unknown
                                                                  : Lookup::NotAnswered;
}

} // namespace Bluetooth
