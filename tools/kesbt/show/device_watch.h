// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_DEVICE_WATCH_H
#define KESBT_SHOW_DEVICE_WATCH_H

#include "show/output.h"
#include "show/style.h"

#include <map>
#include <string>

namespace Kesbt {

/// Prints what happens to the devices within reach: a line for people or an event for programs when
/// one is found, changes or vanishes, and none when nothing changed.
class DeviceWatch {
public:
    explicit DeviceWatch(bool json) : m_json(json) {}

    void found(const std::string& address, const Json& properties);
    void vanished(const std::string& address);

    /// Last properties by address.
    const std::map<std::string, Json>& devices() const { return m_devices; }

private:
    void print(const char* event, Colour colour, const std::string& address, const Json& properties,
               const Json& changed) const;

    bool m_json;
    std::map<std::string, Json> m_devices;
};

} // namespace Kesbt

#endif
