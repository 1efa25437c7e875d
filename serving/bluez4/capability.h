// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_CAPABILITY_H
#define KESBLUETOOTH_SERVING_BLUEZ4_CAPABILITY_H

#include <optional>
#include <string>

namespace Bluetooth::Serving {

/// What one side of a pairing can show and be told.
enum class Capability { DisplayOnly, DisplayYesNo, KeyboardOnly, NoInputNoOutput };

/// @param text  as RegisterAgent takes it; "" and KeyboardDisplay stand for DisplayYesNo, which is
///              what the daemon tells a controller
inline std::optional<Capability> parseCapability(const std::string& text) {
    if (text.empty() || text == "DisplayYesNo" || text == "KeyboardDisplay")
        return Capability::DisplayYesNo;
    if (text == "DisplayOnly")
        return Capability::DisplayOnly;
    if (text == "KeyboardOnly")
        return Capability::KeyboardOnly;
    if (text == "NoInputNoOutput")
        return Capability::NoInputNoOutput;
    return std::nullopt;
}

} // namespace Bluetooth::Serving

#endif
