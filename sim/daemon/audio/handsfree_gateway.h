// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_HANDSFREE_GATEWAY_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_HANDSFREE_GATEWAY_H

#include "daemon/audio/audio_profile.h"
#include "daemon/audio/media_socket.h"
#include "serving/bluez4/audio_interfaces.h"

#include <memory>
#include <optional>
#include <string>

namespace Bluetooth::Sim {

/// org.bluez.HandsfreeGateway: a phone whose hands-free set we are. A client's agent gets the
/// connection and talks to the phone on it.
class HandsfreeGateway : public AudioProfile {
public:
    explicit HandsfreeGateway(DeviceAudio& audio);

    void peerConnects(const std::string& uuid);
    void peerCloses() { close(&Times::audioIdleAtPeer); }
    void setPlaying(bool playing);
    void close(guint Times::*idle = &Times::audioIdle);
    void clientGone(const std::string& client);
    /// The interface goes.
    void releaseAgent();
    void abandon();

private:
    template <class Served>
    friend const Interface& Serving::handsfreeGatewayInterface();

    struct Agent {
        std::string owner;
        std::string path;
    };

    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);
    void getProperties(const CallPtr& call);
    void registerAgent(const CallPtr& call);
    void unregisterAgent(const CallPtr& call);

    void opened();
    void enter(AudioState state);

    std::optional<Agent> m_agent;
    std::unique_ptr<MediaSocket> m_socket;
    CallPtr m_connect; ///< Connect that waits
};

} // namespace Bluetooth::Sim

#endif
