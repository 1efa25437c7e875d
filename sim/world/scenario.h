// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_WORLD_SCENARIO_H
#define KESBLUETOOTH_SIM_WORLD_SCENARIO_H

#include "world/world.h"

#include <string>

namespace Bluetooth::Sim {

/// The text of the scenario that is used when none is named.
const char* defaultScenarioText();

/// Builds a world from a scenario file.
/// @throw std::runtime_error  one line that names the file, the group and the key
World loadScenario(const std::string& file);
World loadDefaultScenario();

} // namespace Bluetooth::Sim

#endif
