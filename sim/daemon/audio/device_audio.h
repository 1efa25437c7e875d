// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_DEVICE_AUDIO_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_DEVICE_AUDIO_H

#include "daemon/audio/audio_stream.h"
#include "daemon/audio/handsfree_gateway.h"
#include "daemon/audio/headset.h"
#include "daemon/audio/remote_control.h"

#include <functional>
#include <memory>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

// Service classes that audio goes by.
inline constexpr const char* remoteTarget = "110c";
inline constexpr const char* advancedAudio = "110d";

/// org.bluez.Audio: what the device's sink and headset are together, and the audio profiles that
/// the device has. A source and a gateway have nothing to do with Audio's state.
class DeviceAudio {
public:
    explicit DeviceAudio(ServedDevice& device) : m_device(device) {}

    /// Serves the interfaces that the device's UUIDs call for and that are not served yet.
    void serve();
    ServedDevice& device() const { return m_device; }
    bool has(const char* uuid) const;
    /// The headset, or null.
    Headset* headset() const { return m_headset.get(); }

    /// The device opens a service of its own: the agent is asked unless the device is trusted.
    void serviceConnects(const std::string& uuid);
    /// It closes that.
    void serviceDisconnects(const std::string& uuid);
    /// Sound starts or stops, on what is connected.
    void setPlaying(bool playing);
    /// The link is going to be closed.
    void disconnectRequested();
    void linkLost();
    void clientGone(const std::string& client);
    /// Tells a client's agent that the device, or the daemon, goes.
    void releaseAgent();
    /// Stops without a word; the device has gone.
    void abandon();

    // What the profiles tell, and ask.

    void sinkChanged(AudioState before);
    void headsetChanged(AudioState before);
    void connectControl();
    void connectControlLater();
    /// One profile was asked for, not all of them.
    void connectOneOnly() { m_connectAll = false; }
    /// Whether Audio.Disconnect, or that of the device, is under way.
    bool ending() const { return m_ending; }
    /// @param wanted  whether we have connected as well: then nobody need be there to ask
    void authorize(const std::string& uuid, bool wanted, const std::function<void(bool)>& done);
    void emit(const char* interface, const char* member, const Value& arguments = {});

private:
    template <class Served>
    friend const Interface& Serving::audioInterface();

    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);
    void getProperties(const CallPtr& call);

    template <class Action>
    void atService(const std::string& uuid, const Action& action);
    AudioState sinkState() const;
    AudioState headsetState() const;
    void enter(AudioState state);
    /// Closes the stream, or gives it up; sinkChanged() goes on from there.
    void shutDownSink();
    void allLost();
    /// Nobody needs an answer any more: the agent is told.
    void stopAsking();

    ServedDevice& m_device;
    bool m_served = false;
    AudioState m_state = AudioState::Disconnected;
    bool m_connectAll = true; ///< whether what connects brings the other profile along
    bool m_ending = false;
    bool m_asking = false; ///< the agent
    bool m_authorized = false;
    CallPtr m_connect;    ///< Connect that waits
    CallPtr m_disconnect; ///< Disconnect that waits
    OneShotTimer m_sinkPause;
    OneShotTimer m_headsetPause;
    OneShotTimer m_shutdown;
    OneShotTimer m_lost;
    std::unique_ptr<AudioStream> m_sink;
    std::unique_ptr<AudioStream> m_source;
    std::unique_ptr<Headset> m_headset;
    std::unique_ptr<HandsfreeGateway> m_gateway;
    std::unique_ptr<RemoteControl> m_control;
};

} // namespace Bluetooth::Sim

#endif
