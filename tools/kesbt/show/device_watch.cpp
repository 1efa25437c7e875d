// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/device_watch.h"

#include "show/text.h"

#include <iostream>

namespace Kesbt {

void DeviceWatch::found(const std::string& address, const Json& properties) {
    const auto [known, isNew] = m_devices.try_emplace(address, properties);
    if (isNew) {
        print("found", Colour::Green, address, properties, Json());
        return;
    }
    Json changed = Json::array();
    for (const auto& [name, value] : properties.items()) {
        if (known->second.value(name, Json()) != value)
            changed.push_back(name);
    }
    if (changed.empty())
        return;
    known->second = properties;
    print("changed", Colour::Yellow, address, properties, changed);
}

void DeviceWatch::vanished(const std::string& address) {
    const auto known = m_devices.find(address);
    const Json last = known == m_devices.end() ? Json::object() : known->second;
    if (known != m_devices.end())
        m_devices.erase(known);
    print("vanished", Colour::Red, address, last, Json());
}

void DeviceWatch::print(const char* event, Colour colour, const std::string& address,
                        const Json& properties, const Json& changed) const {
    if (m_json) {
        Json line = {{"event", event},
                     {"time", timeForPrograms()},
                     {"address", address},
                     {"properties", properties}};
        if (!changed.is_null())
            line["changed"] = changed;
        printEvent(line);
        return;
    }
    constexpr std::size_t eventWidth = 8;
    constexpr std::size_t addressWidth = 17;
    constexpr std::size_t fieldWidth = 8;
    constexpr std::size_t iconWidth = 14;
    const auto column = [&properties](const char* name, std::size_t width) {
        return padded(printable(field(properties, name)), width) + "  ";
    };
    std::cout << coloured(padded(event, eventWidth), colour) << "  "
              << padded(printable(address), addressWidth) << "  " << column("RSSI", fieldWidth)
              << column("Class", fieldWidth) << column("Icon", iconWidth)
              << printable(field(properties, "Alias")) << '\n';
    flushOutput();
}

} // namespace Kesbt
