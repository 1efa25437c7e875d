// SPDX-License-Identifier: LGPL-2.1-or-later
#include "scanner/found_devices.h"

namespace Bluetooth {

std::optional<std::string> FoundDevices::put(const std::string& address, const std::string& text) {
    auto device = m_devices.find(address);
    if (device == m_devices.end()) {
        Ages age{nullptr}; // made first: the receive thread goes on after a lack of memory
        device = m_devices.emplace(address, Device{"", age.begin()}).first;
        age.front() = &device->first;
        m_ages.splice(m_ages.end(), age);
    } else {
        m_ages.splice(m_ages.end(), m_ages, device->second.age);
    }
    device->second.text = text;
    if (m_devices.size() <= mostDevices)
        return std::nullopt;
    std::string oldest = *m_ages.front();
    m_ages.pop_front();
    m_devices.erase(oldest);
    return oldest;
}

const std::string* FoundDevices::find(const std::string& address) const {
    const auto device = m_devices.find(address);
    return device == m_devices.end() ? nullptr : &device->second.text;
}

} // namespace Bluetooth
