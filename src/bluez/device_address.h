// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_DEVICE_ADDRESS_H
#define KESBLUETOOTH_BLUEZ_DEVICE_ADDRESS_H

#include <algorithm>
#include <optional>
#include <string>

namespace Bluetooth {

/// The address in a device's object path, see getAddressFromPath().
/// @return nothing for a path without "dev_"
inline std::optional<std::string> addressInPath(const std::string& path) {
    const std::string mark = "dev_";
    const std::size_t place = path.find(mark);
    if (place == std::string::npos)
        return std::nullopt;
    std::string address = path.substr(place + mark.size());
    std::replace(address.begin(), address.end(), '_', ':');
    return address;
}

} // namespace Bluetooth

#endif
