// SPDX-License-Identifier: LGPL-2.1-or-later
#include "control/world_control.h"

#include "control/arguments.h"
#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/device_services.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/address.h"

#include <algorithm>
#include <stdexcept>

namespace Bluetooth::Sim {

namespace {

/// The service class that is a call's third argument.
std::string uuidOf(const CallPtr& call) {
    std::string uuid = fullUuid(call->text(2));
    if (uuid.empty())
        throw std::runtime_error("\"" + call->text(2) + "\" is not a UUID");
    return uuid;
}

/// What configures the whole world changes altogether or not at all.
template <class Configuration>
Value configure(Configuration& present, const CallPtr& call) {
    Configuration copy = present;
    applySettings(copy, settingsOf(call, 0));
    present = copy;
    return {};
}

} // namespace

ServedAdapter& WorldControl::adapter(const std::string& id) {
    ServedAdapter* found = m_daemon.find(id);
    if (!found)
        throw std::runtime_error("there is no adapter \"" + id + "\"");
    return *found;
}

std::shared_ptr<PeerDevice> WorldControl::peer(const std::string& address) {
    auto found = m_world.peer(upperCase(address));
    if (!found)
        throw std::runtime_error("there is no device \"" + address + "\"");
    return found;
}

std::shared_ptr<ServedDevice> WorldControl::device(const CallPtr& call) {
    auto found = adapter(call->text(0)).find(upperCase(call->text(1)));
    if (!found)
        throw std::runtime_error("the daemon does not know \"" + call->text(1) + "\"");
    return found;
}

void WorldControl::peerChanged(const std::shared_ptr<PeerDevice>& peer) {
    for (const auto& adapter : m_daemon.adapters()) {
        adapter->discovery().peerChanged(peer);
        const auto known = adapter->find(peer->address);
        if (known && !(peer->present && peer->connectable))
            known->link().drop();
    }
}

Value WorldControl::addAdapter(const CallPtr& call) {
    auto hardware = std::make_shared<AdapterHardware>();
    hardware->index = m_world.freeIndex();
    hardware->name = hardware->id();
    const GlibPtr<char> address(g_strdup_printf("00:1A:7D:DA:72:%02X", hardware->index));
    hardware->address = address.get();
    applySettings(*hardware, settingsOf(call, 0));
    for (const auto& peer : m_world.peers)
        World::store(*hardware, *peer);
    m_world.adapters.push_back(hardware);
    if (m_daemon.running())
        m_daemon.plugIn(hardware);
    return tuple(hardware->id());
}

Value WorldControl::removeAdapter(const CallPtr& call) {
    const auto hardware = m_world.adapter(call->text(0));
    if (!hardware)
        throw std::runtime_error("there is no adapter \"" + call->text(0) + "\"");
    if (ServedAdapter* plugged = m_daemon.find(hardware->id()))
        m_daemon.pullOut(*plugged);
    auto& all = m_world.adapters;
    all.erase(std::find(all.begin(), all.end(), hardware));
    return {};
}

Value WorldControl::addDevice(const CallPtr& call) {
    const std::string address = upperCase(call->text(0));
    if (!isAddress(address))
        throw std::runtime_error("\"" + address + "\" is not an address");
    if (m_world.peer(address))
        throw std::runtime_error("there is a device " + address + " already");
    auto peer = std::make_shared<PeerDevice>();
    peer->address = address;
    applySettings(*peer, settingsOf(call, 1));
    m_world.peers.push_back(peer);
    peerChanged(peer);
    return {};
}

Value WorldControl::setDevice(const CallPtr& call) {
    const auto changed = peer(call->text(0));
    PeerDevice copy = *changed; // nothing changes unless everything can
    applySettings(copy, settingsOf(call, 1));
    *changed = copy;
    peerChanged(changed);
    return {};
}

Value WorldControl::removeDevice(const CallPtr& call) {
    const auto gone = peer(call->text(0));
    auto& all = m_world.peers;
    all.erase(std::find(all.begin(), all.end(), gone));
    gone->present = false;
    peerChanged(gone);
    return {};
}

Value WorldControl::comeIn(const CallPtr& call, bool pairing) {
    ServedAdapter& to = adapter(call->text(0));
    const auto from = peer(call->text(1));
    if (!to.mode().powered())
        throw std::runtime_error("the adapter is off");
    auto known = to.find(from->address);
    if (known && (known->busy() || known->pairing()))
        throw std::runtime_error("the device is busy");
    to.learnClass(*from);
    if (!known)
        known = to.addDevice(from->address);
    known->comeIn(pairing);
    return {};
}

Value WorldControl::connectDevice(const CallPtr& call) {
    return comeIn(call, false);
}

Value WorldControl::startIncomingPairing(const CallPtr& call) {
    return comeIn(call, true);
}

Value WorldControl::connectService(const CallPtr& call) {
    const std::string uuid = uuidOf(call);
    const auto from = device(call);
    if (!from->adapter().mode().powered())
        throw std::runtime_error("the adapter is off");
    if (!from->services().peerConnects(uuid))
        from->audio().serviceConnects(uuid);
    return {};
}

Value WorldControl::disconnectService(const CallPtr& call) {
    const std::string uuid = uuidOf(call);
    const auto from = device(call);
    if (!from->services().peerDisconnects(uuid))
        from->audio().serviceDisconnects(uuid);
    return {};
}

Headset& WorldControl::headset(const CallPtr& call) {
    Headset* found = device(call)->audio().headset();
    if (!found || !found->connected())
        throw std::runtime_error("the device is not connected as a headset");
    return *found;
}

Value WorldControl::pressHeadsetButton(const CallPtr& call) {
    headset(call).press();
    return {};
}

Value WorldControl::setHeadsetGain(const CallPtr& call) {
    const guint16 gain = g_variant_get_uint16(call->argument(3).get());
    if (!headset(call).setGain(call->text(2), gain))
        throw std::runtime_error("SpeakerGain and MicrophoneGain change to another value up to 15");
    return {};
}

Value WorldControl::dropLink(const CallPtr& call) {
    device(call)->link().drop();
    return {};
}

Value WorldControl::setPlaying(const CallPtr& call) {
    device(call)->audio().setPlaying(call->argument(2).flag());
    return {};
}

Value WorldControl::setTimeScale(const CallPtr& call) {
    const double scale = g_variant_get_double(call->argument(0).get());
    if (!(scale >= 0 && scale <= 1000))
        throw std::runtime_error("a time scale is from 0 to 1000");
    m_world.times.scale = scale;
    return {};
}

Value WorldControl::setTimes(const CallPtr& call) {
    return configure(m_world.times, call);
}

Value WorldControl::setAudio(const CallPtr& call) {
    return configure(m_world.audio, call);
}

} // namespace Bluetooth::Sim
