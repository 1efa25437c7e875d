#ifndef KESBLUETOOTH_SIM_WORLD_CAPABILITY_H
#define KESBLUETOOTH_SIM_WORLD_CAPABILITY_H

#include <optional>
#include <string>

namespace Bluetooth::Sim {

/// What one side of a pairing can show and be told.
enum class Capability { DisplayOnly, DisplayYesNo, KeyboardOnly, NoInputNoOutput };

/// @param text  as RegisterAgent takes it: "" stands for DisplayYesNo; KeyboardDisplay is treated
/// as
///              DisplayYesNo, which is what the daemon tells a controller
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

} // namespace Bluetooth::Sim

#endif
