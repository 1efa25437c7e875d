// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/adapter_discovery.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/address.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/icon.h"
#include "serving/bus/dict_builder.h"

#include <algorithm>

namespace Bluetooth::Sim {

void AdapterDiscovery::startSession(const CallPtr& call) {
    const bool first = m_sessions.empty();
    ++m_sessions[call->sender()];
    call->reply();
    if (first)
        begin();
}

void AdapterDiscovery::stopSession(const CallPtr& call) {
    const auto session = m_sessions.find(call->sender());
    if (session == m_sessions.end())
        return call->fail(Errors::failed("Invalid discovery session"));
    if (--session->second == 0)
        m_sessions.erase(session);
    call->reply();
    if (m_sessions.empty())
        end();
}

void AdapterDiscovery::clientGone(const std::string& client) {
    if (m_sessions.erase(client) && m_sessions.empty())
        end();
}

void AdapterDiscovery::stop() {
    m_sessions.clear();
    end();
}

void AdapterDiscovery::suspend() {
    if (m_suspensions++ == 0)
        end();
}

void AdapterDiscovery::resume() {
    if (--m_suspensions == 0 && !m_sessions.empty())
        begin();
}

void AdapterDiscovery::begin() {
    if (m_suspensions || !m_adapter.mode().powered())
        return;
    m_found.clear();
    m_began = g_get_monotonic_time();
    setActive(true);
    startRound();
}

void AdapterDiscovery::end() {
    m_finder.stop();
    m_roundEnd.stop();
    m_inquiring = false;
    if (m_active)
        setActive(false);
}

void AdapterDiscovery::setActive(bool active) {
    m_active = active;
    m_adapter.changed("Discovering", active);
}

void AdapterDiscovery::startRound() {
    const Times& times = m_adapter.daemon().times();
    ++m_round;
    m_inquiring = true;
    for (auto& [address, found] : m_found)
        found.inThisRound = false;
    const auto& peers = m_adapter.daemon().world().peers;
    m_toFind.assign(peers.begin(), peers.end());
    m_toName.clear();
    m_finder.start(times.scaled(times.firstFound), [this] { findNext(); });
    m_roundEnd.start(times.scaled(times.inquiry), [this] {
        m_inquiring = false;
        m_finder.stop();
        askNames();
    });
}

void AdapterDiscovery::findNext() {
    const Times& times = m_adapter.daemon().times();
    // However many there are, all are found well before the end of the round.
    const std::size_t most = std::max<std::size_t>(1, m_adapter.daemon().world().peers.size());
    const guint interval =
        std::min(times.foundInterval, static_cast<guint>(times.inquiry * 3 / 4 / most));
    while (!m_toFind.empty()) {
        const auto peer = m_toFind.front();
        m_toFind.pop_front();
        if (!visible(*peer))
            continue;
        see(*peer);
        if (!peer->nameInInquiry)
            m_toName.push_back(peer);
        break;
    }
    if (!m_toFind.empty())
        m_finder.start(times.scaled(interval), [this] { findNext(); });
}

void AdapterDiscovery::askNames() {
    const auto known = [this](const std::shared_ptr<PeerDevice>& peer) {
        return !m_adapter.hardware().storage[peer->address].name.empty();
    };
    m_toName.erase(std::remove_if(m_toName.begin(), m_toName.end(), known), m_toName.end());
    askNextName();
}

void AdapterDiscovery::askNextName() {
    const Times& times = m_adapter.daemon().times();
    if (m_toName.empty())
        return m_roundEnd.start(times.scaled(times.inquiryGap), [this] { endRound(); });
    m_roundEnd.start(times.scaled(times.nameRequest), [this] {
        const auto peer = m_toName.front();
        m_toName.pop_front();
        if (peer->connectable && visible(*peer)) {
            m_adapter.hardware().storage[peer->address].name = peer->name;
            see(*peer);
            if (const auto device = m_adapter.find(peer->address))
                device->learnName();
        }
        askNextName();
    });
}

void AdapterDiscovery::endRound() {
    setActive(false);
    for (auto found = m_found.begin(); found != m_found.end();) {
        if (found->second.inThisRound) {
            ++found;
            continue;
        }
        m_adapter.emit("DeviceDisappeared", tuple(found->first));
        found = m_found.erase(found);
    }
    setActive(true);
    startRound();
}

bool AdapterDiscovery::visible(const PeerDevice& peer) const {
    if (!peer.present || (!peer.adapter.empty() && peer.adapter != m_adapter.hardware().id()))
        return false;
    const gint64 elapsed = (g_get_monotonic_time() - m_began) / 1000;
    return peer.visibleFor == 0 || elapsed < m_adapter.daemon().times().scaled(peer.visibleFor);
}

void AdapterDiscovery::peerChanged(const std::shared_ptr<PeerDevice>& peer) {
    if (m_active && m_inquiring && visible(*peer)) {
        see(*peer);
        if (!peer->nameInInquiry)
            m_toName.push_back(peer);
    }
}

void AdapterDiscovery::see(PeerDevice& peer) {
    m_adapter.learnClass(peer);
    // A name that comes with the inquiry is shown, but only one that was asked for is stored.
    const std::string& stored = m_adapter.hardware().storage[peer.address].name;
    const std::string& name = peer.nameInInquiry ? peer.name : stored;

    const int range = static_cast<int>(peer.rssiVariation);
    const int offset = range ? static_cast<int>(m_round * 3 + 1) % (2 * range + 1) - range : 0;
    const auto rssi = static_cast<gint16>(peer.rssi + offset);

    const auto before = m_found.find(peer.address);
    const bool news =
        before == m_found.end() || before->second.rssi != rssi || before->second.name != name;
    m_found[peer.address] = {rssi, name, true};
    if (news)
        report(peer, rssi, name);
}

void AdapterDiscovery::report(const PeerDevice& peer, gint16 rssi, const std::string& name) {
    const StoredDevice& stored = m_adapter.hardware().storage[peer.address];
    std::string alias = stored.alias.empty() ? name : stored.alias;
    if (alias.empty())
        alias = withSeparator(peer.address, '-');
    DictBuilder values;
    values.add("Address", peer.address)
        .add("Class", peer.deviceClass)
        .add("Icon", iconOf(peer.deviceClass))
        .add("RSSI", rssi);
    if (!name.empty())
        values.add("Name", name);
    values.add("Alias", alias).add("LegacyPairing", peer.legacy).add("Paired", stored.paired);
    if (peer.lowEnergy)
        values.add("Broadcaster", peer.broadcaster);
    else
        values.add("Trusted", stored.trusted);
    if (!peer.uuids.empty())
        values.add("UUIDs", listValue("s", peer.uuids));
    m_adapter.emit("DeviceFound", tuple(peer.address, values.end()));
}

} // namespace Bluetooth::Sim
