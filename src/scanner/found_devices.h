// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_FOUND_DEVICES_H
#define KESBLUETOOTH_SCANNER_FOUND_DEVICES_H

#include <list>
#include <optional>
#include <string>
#include <unordered_map>

namespace Bluetooth {

/// The formatted properties of the devices that were heard of last, by address. Whoever can send
/// signals can invent devices: there is room for so many, and the one that was not heard of for
/// longest makes room for a new one.
class FoundDevices {
public:
    static constexpr std::size_t mostDevices = 4096;

    /// Keeps a device's text in place of an earlier one.
    /// @return the address of the device that had to go
    std::optional<std::string> put(const std::string& address, const std::string& text);

    /// @return null for an unknown address
    const std::string* find(const std::string& address) const;

private:
    using Ages = std::list<const std::string*>; // addresses, the longest unheard of in front
    struct Device {
        std::string text;
        Ages::iterator age;
    };

    std::unordered_map<std::string, Device> m_devices;
    Ages m_ages;
};

} // namespace Bluetooth

#endif
