// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_DEVICE_ADDRESS_H
#define KESBLUETOOTH_BLUEZ_DEVICE_ADDRESS_H

#include <algorithm>
#include <optional>
#include <string>
#include <string_view>

namespace Bluetooth {

/// Whether a text is six two-digit hexadecimal groups with colons between them.
inline bool isAddress(const std::string& text) {
    constexpr std::string_view digits = "0123456789ABCDEFabcdef";
    constexpr std::size_t length = 17;
    if (text.size() != length)
        return false;
    for (std::size_t i = 0; i < length; ++i) {
        const bool fits = i % 3 == 2 ? text[i] == ':' : digits.find(text[i]) != digits.npos;
        if (!fits)
            return false;
    }
    return true;
}

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
