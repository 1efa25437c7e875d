// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_AUDIO_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_AUDIO_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bluez4/interfaces.h"
#include "serving/bus/one_shot_timer.h"

#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// The audio side of a device: org.bluez.Audio, and org.bluez.AudioSink and org.bluez.Control when
/// its service classes have them.
class DeviceAudio {
public:
    explicit DeviceAudio(ServedDevice& device) : m_device(device) {}

    /// Serves the interfaces that the device's UUIDs call for and that are not served yet.
    void serve();
    /// The device opens a service of its own: the agent is asked unless the device is trusted.
    void serviceConnects(const std::string& uuid);
    /// A stream starts or stops.
    void setPlaying(bool playing);
    void linkLost();
    void abandon();

private:
    enum class State { Disconnected, Connecting, Connected, Playing };

    template <class Served>
    friend const Interface& Serving::audioInterface();
    template <class Served>
    friend const Interface& Serving::audioSinkInterface();
    template <class Served>
    friend const Interface& Serving::remoteControlInterface();

    static const char* text(State state);

    void connectAudio(const CallPtr& call);
    void disconnectAudio(const CallPtr& call);
    void audioProperties(const CallPtr& call);
    void connectSink(const CallPtr& call);
    void disconnectSink(const CallPtr& call);
    void sinkIsConnected(const CallPtr& call);
    void sinkProperties(const CallPtr& call);
    void controlIsConnected(const CallPtr& call);
    void controlProperties(const CallPtr& call);
    void volume(const CallPtr& call);

    bool has(const char* uuid) const;
    void beginConnecting();
    void linkReached();
    void authorize(const std::string& uuid);
    void setUpStream();
    void connected();
    void failed();
    void disconnected();
    void setSink(State state);
    void setAudio(State state);
    void setControl(bool connected);
    void emit(const char* interface, const char* member, const Value& arguments = {});
    void changed(const char* interface, const char* property, const Value& value);

    ServedDevice& m_device;
    bool m_audioServed = false;
    bool m_sinkServed = false;
    bool m_controlServed = false;
    State m_audio = State::Disconnected;
    State m_sink = State::Disconnected;
    bool m_control = false;
    Link::Hold m_hold;
    CallPtr m_audioCall; ///< Audio.Connect that waits
    CallPtr m_sinkCall;  ///< AudioSink.Connect that waits
    OneShotTimer m_setUp;
    OneShotTimer m_controlSetUp;
};

} // namespace Bluetooth::Sim

#endif
