// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_REMOTE_CONTROL_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_REMOTE_CONTROL_H

#include "serving.h"
#include "serving/bluez4/audio_interfaces.h"
#include "serving/bus/one_shot_timer.h"

#include <string>

namespace Bluetooth::Sim {

class DeviceAudio;

/// org.bluez.Control: it comes and goes with the stream.
class RemoteControl {
public:
    explicit RemoteControl(DeviceAudio& audio) : m_audio(audio) {}

    void connect() { setConnected(true); }
    void connectLater();
    void disconnect() { setConnected(false); }
    void peerConnects(const std::string&) { connect(); }
    void peerCloses() { disconnect(); }
    void abandon() { m_timer.stop(); }

private:
    template <class Served>
    friend const Interface& Serving::remoteControlInterface();

    void isConnected(const CallPtr& call);
    void getProperties(const CallPtr& call);
    void changeVolume(const CallPtr& call);
    void setConnected(bool connected);

    DeviceAudio& m_audio;
    bool m_connected = false;
    OneShotTimer m_timer;
};

} // namespace Bluetooth::Sim

#endif
