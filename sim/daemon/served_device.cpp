// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/served_device.h"

#include "daemon/bluetoothd.h"
#include "daemon/device_audio.h"
#include "daemon/device_creation.h"
#include "daemon/device_pairing.h"
#include "daemon/served_adapter.h"
#include "daemon/service_search.h"
#include "serving/bluez4/address.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/icon.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

#include <algorithm>

namespace Bluetooth::Sim {

ServedDevice::ServedDevice(ServedAdapter& adapter, std::string address)
    : m_adapter(adapter),
      m_address(std::move(address)),
      m_path(adapter.path() + "/dev_" + withSeparator(m_address, '_')),
      m_stored(adapter.hardware().storage[m_address]),
      m_classKnown(m_stored.deviceClass.has_value()),
      m_name(m_stored.name),
      m_link(*this) {
    m_adapter.daemon().objects().add(m_path, deviceInterface<ServedDevice>(), this);
    m_audio = std::make_unique<DeviceAudio>(*this);
    m_audio->serve();
}

ServedDevice::~ServedDevice() {
    retire();
}

void ServedDevice::retire() {
    if (m_retired)
        return;
    m_retired = true;
    m_link.abandon();
    m_reverseSearch.stop();
    Bluetoothd& daemon = m_adapter.daemon();
    m_audio->abandon();
    const auto end = [&](auto& work) {
        if (!work)
            return;
        work->abandon();
        daemon.bury(std::move(work));
    };
    end(m_creation);
    end(m_pairing);
    end(m_search);
    daemon.objects().remove(m_path);
}

std::shared_ptr<PeerDevice> ServedDevice::peer() const {
    return m_adapter.peerAt(m_address);
}

bool ServedDevice::reachable() const {
    const auto peer = this->peer();
    return peer && peer->present && peer->connectable && !m_stored.blocked;
}

bool ServedDevice::busy() const {
    return m_creation || m_pairing || m_search;
}

void ServedDevice::emit(const char* member, const Value& arguments) {
    m_adapter.daemon().bus().emit(m_path, Interfaces::device, member, arguments);
}

void ServedDevice::changed(const char* property, const Value& value) {
    emit("PropertyChanged", propertyChange(property, value));
}

std::string ServedDevice::alias() const {
    if (!m_stored.alias.empty())
        return m_stored.alias;
    return m_name.empty() ? withSeparator(m_address, '-') : m_name;
}

void ServedDevice::getProperties(const CallPtr& call) {
    DictBuilder properties;
    properties.add("Address", m_address)
        .add("Name", m_name)
        .add("Alias", alias())
        .add("Class", m_stored.deviceClass)
        .add("Icon", iconOf(m_stored.deviceClass))
        .add("Vendor", m_stored.vendor)
        .add("Product", m_stored.product)
        .add("Version", m_stored.version)
        .add("Paired", m_stored.paired)
        .add("Trusted", m_stored.trusted)
        .add("Blocked", m_stored.blocked)
        .add("Connected", m_link.up())
        .add("UUIDs", listValue("s", m_stored.uuids))
        .add("Services", listValue("o", {}))
        .add("Adapter", pathValue(m_adapter.path()));
    call->reply(tuple(properties.end()));
}

void ServedDevice::setProperty(const CallPtr& call) {
    const bool answered = setOneOf({{"Alias", "s", &ServedDevice::setAlias},
                                    {"Trusted", "b", &ServedDevice::setTrusted},
                                    {"Blocked", "b", &ServedDevice::setBlocked}},
                                   *this, call);
    if (!answered)
        call->fail(Errors::invalidArguments);
}

void ServedDevice::setAlias(const CallPtr& call, const Value& value) {
    if (value.text() != m_stored.alias) {
        m_stored.alias = value.text();
        // Sent as it was given: "" too, though the name stands for it from now on.
        changed("Alias", value);
    }
    call->reply();
}

void ServedDevice::setTrusted(const CallPtr& call, const Value& value) {
    if (value.flag() != m_stored.trusted) {
        m_stored.trusted = value.flag();
        changed("Trusted", value);
    }
    call->reply();
}

void ServedDevice::setBlocked(const CallPtr& call, const Value& value) {
    if (value.flag() != m_stored.blocked) {
        m_stored.blocked = value.flag();
        if (m_stored.blocked)
            m_link.drop();
        changed("Blocked", value);
    }
    call->reply();
}

void ServedDevice::discoverServices(const CallPtr& call) {
    if (busy())
        return call->fail(Errors::inProgress);
    m_search = ServiceSearch::begin(*this, call);
}

void ServedDevice::cancelDiscovery(const CallPtr& call) {
    if (!m_search)
        return call->fail(Errors::doesNotExist);
    if (m_search->owner() != call->sender())
        return call->fail(Errors::notAuthorized);
    m_search->cancel();
    call->reply();
}

void ServedDevice::disconnect(const CallPtr& call) {
    if (!m_link.up())
        return call->fail(Errors::notConnected);
    m_link.requestDisconnect(call);
}

void ServedDevice::create(const CallPtr& call) {
    m_creation = std::make_shared<DeviceCreation>(*this, call);
    m_creation->begin();
}

void ServedDevice::pair(const CallPtr& call) {
    m_pairing = DevicePairing::outgoing(*this, call);
    m_pairing->begin();
}

void ServedDevice::comeIn(bool pairing) {
    const Times& times = m_adapter.daemon().times();
    m_link.accept(!pairing);
    if (pairing) {
        m_pairing = DevicePairing::incoming(*this);
        m_pairing->begin();
        return;
    }
    m_reverseSearch.start(times.scaled(times.reverseSearch), [this] { learnServices(); });
}

void ServedDevice::creationEnded() {
    m_adapter.daemon().bury(std::move(m_creation));
}

void ServedDevice::pairingEnded() {
    m_adapter.daemon().bury(std::move(m_pairing));
}

void ServedDevice::searchEnded() {
    m_adapter.daemon().bury(std::move(m_search));
}

void ServedDevice::seen() {
    if (!m_classKnown) {
        m_classKnown = true;
        changed("Class", *m_stored.deviceClass);
        if (const auto icon = iconOf(m_stored.deviceClass))
            changed("Icon", *icon);
    }
    learnName();
}

void ServedDevice::learnName() {
    const auto peer = this->peer();
    if (m_link.up() && peer)
        m_stored.name = peer->name;
    if (m_stored.name == m_name)
        return;
    m_name = m_stored.name;
    changed("Name", m_name);
    if (m_stored.alias.empty())
        changed("Alias", alias());
}

void ServedDevice::learnServices() {
    const auto peer = this->peer();
    if (!peer)
        return;
    if (peer->vendor && !m_stored.vendor) {
        m_stored.vendor = peer->vendor;
        m_stored.product = peer->product.value_or(0);
        m_stored.version = peer->version.value_or(0);
        changed("Vendor", *m_stored.vendor);
        changed("Product", *m_stored.product);
        changed("Version", *m_stored.version);
    }
    if (m_stored.uuids == peer->uuids)
        return;
    m_stored.uuids = peer->uuids;
    m_audio->serve();
    changed("UUIDs", listValue("s", m_stored.uuids));
}

void ServedDevice::setPaired(bool paired) {
    if (paired == m_stored.paired)
        return;
    m_stored.paired = paired;
    changed("Paired", paired);
}

void ServedDevice::linkLost() {
    const auto alive = shared_from_this();
    m_reverseSearch.stop();
    m_audio->linkLost();
    if (m_search)
        m_search->linkLost();
    if (m_creation)
        m_creation->linkLost();
    else if (m_pairing)
        m_pairing->linkLost();
    else if (m_temporary)
        m_adapter.forgetDevice(alive);
}

void ServedDevice::clientGone(const std::string& client) {
    const auto alive = shared_from_this();
    if (m_search && m_search->owner() == client)
        m_search->ownerGone();
    if (m_creation && m_creation->owner() == client)
        m_creation->ownerGone();
    if (m_pairing && m_pairing->owner() == client)
        m_pairing->ownerGone();
}

} // namespace Bluetooth::Sim
