// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_ADAPTER_DISCOVERY_H
#define KESBLUETOOTH_SIM_DAEMON_ADAPTER_DISCOVERY_H

#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"
#include "world/peer_device.h"

#include <deque>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

class ServedAdapter;

/// The discovery of one adapter, shared by the clients that started it.
///
/// It runs in rounds: an inquiry that finds devices, then the names that did not come with it.
class AdapterDiscovery {
public:
    explicit AdapterDiscovery(ServedAdapter& adapter) : m_adapter(adapter) {}

    bool active() const { return m_active; }

    void startSession(const CallPtr& call);
    void stopSession(const CallPtr& call);
    void clientGone(const std::string& client);
    /// Ends all sessions.
    void stop();

    /// Ends the running round while a device is being connected, and starts anew after it.
    void suspend();
    void resume();

    /// A device in the air came, went or changed.
    void peerChanged(const std::shared_ptr<PeerDevice>& peer);

private:
    struct Found {
        gint16 rssi;
        std::string name;
        bool inThisRound;
    };

    void begin();
    void end();
    void setActive(bool active);
    void startRound();
    void findNext();
    void askNames();
    void askNextName();
    void endRound();
    void see(PeerDevice& peer);
    void report(const PeerDevice& peer, gint16 rssi, const std::string& name);
    bool visible(const PeerDevice& peer) const;

    ServedAdapter& m_adapter;
    std::map<std::string, unsigned> m_sessions; ///< how often each client started it
    std::map<std::string, Found> m_found;
    std::deque<std::shared_ptr<PeerDevice>> m_toFind;
    std::deque<std::shared_ptr<PeerDevice>> m_toName;
    bool m_active = false;
    bool m_inquiring = false;
    unsigned m_suspensions = 0;
    unsigned m_round = 0;
    gint64 m_began = 0;
    OneShotTimer m_finder;
    OneShotTimer m_roundEnd;
};

} // namespace Bluetooth::Sim

#endif
