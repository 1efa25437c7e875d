// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_WORLD_BEHAVIOUR_H
#define KESBLUETOOTH_SIM_WORLD_BEHAVIOUR_H

#include "world/peer_device.h"

#include <functional>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// A name for what makes a device behave in one way. The table of them is all that scenarios, the
/// control interface and --list-behaviours know.
struct Behaviour {
    const char* name;
    const char* description;
    std::function<void(PeerDevice& device)> apply;
};

const std::vector<Behaviour>& behaviours();
/// The behaviour of that name, or null.
const Behaviour* findBehaviour(const std::string& name);

} // namespace Bluetooth::Sim

#endif
