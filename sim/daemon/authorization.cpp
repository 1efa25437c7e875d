// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/authorization.h"

#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"

namespace Bluetooth::Sim {

bool authorize(ServedDevice& device, const std::string& uuid, std::function<void(bool)> onAnswer) {
    const auto answered = [alive = device.weak_from_this(), onAnswer](bool allowed) {
        if (const auto still = alive.lock())
            onAnswer(allowed);
    };
    if (device.stored().trusted) {
        answered(true);
        return true;
    }
    ClientAgent* agent = device.adapter().agent();
    if (!agent || agent->busy())
        return false;
    agent->ask("Authorize", tuple(pathValue(device.path()), uuid), "",
               device.adapter().daemon().times().agentTimeout,
               [answered](const CallResult& answer) { answered(!answer.failed); });
    return true;
}

} // namespace Bluetooth::Sim
