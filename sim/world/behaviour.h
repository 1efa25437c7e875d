#ifndef KESBLUETOOTH_SIM_WORLD_BEHAVIOUR_H
#define KESBLUETOOTH_SIM_WORLD_BEHAVIOUR_H

#include "world/peer_device.h"

#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// A named set of settings that makes a device behave in one way.
struct Behaviour {
    const char* name;
    const char* description;
    void (*apply)(PeerDevice& peer);
};

const std::vector<Behaviour>& behaviours();
/// The behaviour of that name, or null.
const Behaviour* findBehaviour(const std::string& name);

} // namespace Bluetooth::Sim

#endif
