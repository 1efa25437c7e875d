#include "daemon/discovery.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/daemon.h"
#include "daemon/device.h"
#include "world/address.h"
#include "world/icon.h"

#include <algorithm>

namespace Bluetooth::Sim {

void Discovery::startSession(const CallPtr& call) {
    const bool first = sessions_.empty();
    ++sessions_[call->sender()];
    call->reply();
    if (first)
        begin();
}

void Discovery::stopSession(const CallPtr& call) {
    const auto session = sessions_.find(call->sender());
    if (session == sessions_.end())
        return call->fail(Errors::failed("Invalid discovery session"));
    if (--session->second == 0)
        sessions_.erase(session);
    call->reply();
    if (sessions_.empty())
        end();
}

void Discovery::clientGone(const std::string& client) {
    if (sessions_.erase(client) && sessions_.empty())
        end();
}

void Discovery::stop() {
    sessions_.clear();
    end();
}

void Discovery::suspend() {
    if (suspensions_++ == 0)
        end();
}

void Discovery::resume() {
    if (--suspensions_ == 0 && !sessions_.empty())
        begin();
}

void Discovery::begin() {
    if (suspensions_)
        return;
    found_.clear();
    began_ = g_get_monotonic_time();
    setActive(true);
    startRound();
}

void Discovery::end() {
    finder_.stop();
    roundEnd_.stop();
    inquiring_ = false;
    if (active_)
        setActive(false);
}

void Discovery::setActive(bool active) {
    active_ = active;
    adapter_.changed("Discovering", boolValue(active));
}

void Discovery::startRound() {
    const Times& times = adapter_.daemon().times();
    ++round_;
    inquiring_ = true;
    for (auto& [address, found] : found_)
        found.inThisRound = false;
    const auto& peers = adapter_.daemon().world().peers;
    toFind_.assign(peers.begin(), peers.end());
    toName_.clear();
    finder_.start(times.scaled(times.firstFound), [this] { findNext(); });
    roundEnd_.start(times.scaled(times.inquiry), [this] {
        inquiring_ = false;
        finder_.stop();
        askNames();
    });
}

void Discovery::findNext() {
    const Times& times = adapter_.daemon().times();
    // However many there are, all are found well before the end of the round.
    const std::size_t most = std::max<std::size_t>(1, adapter_.daemon().world().peers.size());
    const guint interval =
        std::min(times.foundInterval, static_cast<guint>(times.inquiry * 3 / 4 / most));
    while (!toFind_.empty()) {
        const auto peer = toFind_.front();
        toFind_.pop_front();
        if (!visible(*peer))
            continue;
        see(*peer);
        if (!peer->nameInInquiry)
            toName_.push_back(peer);
        break;
    }
    if (!toFind_.empty())
        finder_.start(times.scaled(interval), [this] { findNext(); });
}

void Discovery::askNames() {
    const auto known = [this](const std::shared_ptr<Peer>& peer) {
        return !adapter_.hardware().storage[peer->address].name.empty();
    };
    toName_.erase(std::remove_if(toName_.begin(), toName_.end(), known), toName_.end());
    askNextName();
}

void Discovery::askNextName() {
    const Times& times = adapter_.daemon().times();
    if (toName_.empty())
        return roundEnd_.start(times.scaled(times.inquiryGap), [this] { endRound(); });
    roundEnd_.start(times.scaled(times.nameRequest), [this] {
        const auto peer = toName_.front();
        toName_.pop_front();
        if (peer->connectable && visible(*peer)) {
            adapter_.hardware().storage[peer->address].name = peer->name;
            see(*peer);
        }
        askNextName();
    });
}

void Discovery::endRound() {
    setActive(false);
    for (auto found = found_.begin(); found != found_.end();) {
        if (found->second.inThisRound) {
            ++found;
            continue;
        }
        adapter_.emit("DeviceDisappeared", tuple(textValue(found->first)));
        found = found_.erase(found);
    }
    setActive(true);
    startRound();
}

bool Discovery::visible(const Peer& peer) const {
    if (!peer.present || (!peer.adapter.empty() && peer.adapter != adapter_.hardware().id()))
        return false;
    const gint64 elapsed = (g_get_monotonic_time() - began_) / 1000;
    return peer.visibleFor == 0 || elapsed < adapter_.daemon().times().scaled(peer.visibleFor);
}

void Discovery::peerChanged(const std::shared_ptr<Peer>& peer) {
    if (active_ && inquiring_ && visible(*peer)) {
        see(*peer);
        if (!peer->nameInInquiry)
            toName_.push_back(peer);
    }
}

void Discovery::see(Peer& peer) {
    StoredDevice& stored = adapter_.hardware().storage[peer.address];
    stored.deviceClass = peer.deviceClass;
    if (peer.nameInInquiry)
        stored.name = peer.name;

    const int range = static_cast<int>(peer.rssiVariation);
    const int offset = range ? static_cast<int>(round_ * 3 + 1) % (2 * range + 1) - range : 0;
    const auto rssi = static_cast<gint16>(peer.rssi + offset);

    const auto before = found_.find(peer.address);
    const bool news =
        before == found_.end() || before->second.rssi != rssi || before->second.name != stored.name;
    found_[peer.address] = {rssi, stored.name, true};
    if (const auto device = adapter_.find(peer.address))
        device->seen();
    if (news)
        report(peer, rssi);
}

void Discovery::report(const Peer& peer, gint16 rssi) {
    const StoredDevice& stored = adapter_.hardware().storage[peer.address];
    Dict values;
    values.add("Address", textValue(peer.address));
    values.add("Class", g_variant_new_uint32(peer.deviceClass));
    if (const char* icon = iconOf(peer.deviceClass))
        values.add("Icon", g_variant_new_string(icon));
    values.add("RSSI", g_variant_new_int16(rssi));
    if (!stored.name.empty())
        values.add("Name", textValue(stored.name));
    std::string alias = stored.alias.empty() ? stored.name : stored.alias;
    if (alias.empty())
        alias = withSeparator(peer.address, '-');
    values.add("Alias", textValue(alias));
    values.add("LegacyPairing", boolValue(peer.legacy));
    values.add("Paired", boolValue(stored.paired));
    if (peer.lowEnergy)
        values.add("Broadcaster", boolValue(peer.broadcaster));
    else
        values.add("Trusted", boolValue(stored.trusted));
    if (!peer.uuids.empty())
        values.add("UUIDs", listValue("s", peer.uuids));
    adapter_.emit("DeviceFound",
                  g_variant_new("(s@a{sv})", peer.address.c_str(), values.end().get()));
}

} // namespace Bluetooth::Sim
