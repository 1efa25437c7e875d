// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_WORLD_SETTINGS_H
#define KESBLUETOOTH_SIM_WORLD_SETTINGS_H

#include "world/world.h"

#include <map>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace Bluetooth::Sim {

/// A setting that cannot be used; `key()` says which.
class SettingError : public std::runtime_error {
public:
    SettingError(std::string key, const std::string& what)
        : std::runtime_error(what), m_key(std::move(key)) {}
    const std::string& key() const { return m_key; }

private:
    std::string m_key;
};

/// Keys and values in the order in which they were written.
using Settings = std::vector<std::pair<std::string, std::string>>;

/// Each of these sets what the keys name, and throws SettingError at the first that is unknown or
/// has an unusable value. Behaviours are applied first, so that other keys refine them.
void applySettings(PeerDevice& device, const Settings& settings);
void applySettings(AdapterHardware& adapter, const Settings& settings);
void applySettings(AudioConfiguration& audio, const Settings& settings);
void applySettings(Times& times, const Settings& settings);

/// Text forms of service classes: "110b", "0x110B" and full UUIDs all become full lower-case UUIDs.
/// @return "" for anything else
std::string fullUuid(const std::string& text);

} // namespace Bluetooth::Sim

#endif
