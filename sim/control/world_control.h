// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_CONTROL_WORLD_CONTROL_H
#define KESBLUETOOTH_SIM_CONTROL_WORLD_CONTROL_H

#include "serving.h"
#include "serving/bus/call.h"
#include "world/world.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class Bluetoothd;
class Headset;
class ServedAdapter;
class ServedDevice;

/// The methods of the control interface that change what exists, and what happens in the air.
///
/// Each takes its arguments from the call and returns the results for it. What cannot be done is
/// thrown as SettingError or std::runtime_error, and nothing has changed.
class WorldControl {
public:
    WorldControl(World& world, Bluetoothd& daemon) : m_world(world), m_daemon(daemon) {}

    Value addAdapter(const CallPtr& call);
    Value removeAdapter(const CallPtr& call);
    Value addDevice(const CallPtr& call);
    Value setDevice(const CallPtr& call);
    Value removeDevice(const CallPtr& call);
    Value connectDevice(const CallPtr& call);
    Value startIncomingPairing(const CallPtr& call);
    Value connectService(const CallPtr& call);
    Value disconnectService(const CallPtr& call);
    Value pressHeadsetButton(const CallPtr& call);
    Value setHeadsetGain(const CallPtr& call);
    Value dropLink(const CallPtr& call);
    Value setPlaying(const CallPtr& call);
    Value setTimeScale(const CallPtr& call);
    Value setTimes(const CallPtr& call);
    Value setAudio(const CallPtr& call);

    /// The daemon's adapter of that name.
    ServedAdapter& adapter(const std::string& id);

private:
    Value comeIn(const CallPtr& call, bool pairing);
    std::shared_ptr<ServedDevice> device(const CallPtr& call);
    Headset& headset(const CallPtr& call);
    std::shared_ptr<PeerDevice> peer(const std::string& address);
    void peerChanged(const std::shared_ptr<PeerDevice>& peer);

    World& m_world;
    Bluetoothd& m_daemon;
};

} // namespace Bluetooth::Sim

#endif
