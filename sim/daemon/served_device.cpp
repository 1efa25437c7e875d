// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/served_device.h"

#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/device_pairing.h"
#include "daemon/device_services.h"
#include "daemon/served_adapter.h"
#include "daemon/service_records.h"
#include "daemon/service_search.h"
#include "serving/bluez4/address.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/icon.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

#include <set>
#include <utility>

namespace Bluetooth::Sim {

ServedDevice::ServedDevice(ServedAdapter& adapter, std::string address)
    : m_adapter(adapter),
      m_address(std::move(address)),
      m_path(adapter.path() + "/dev_" + withSeparator(m_address, '_')),
      m_stored(adapter.hardware().storage[m_address]),
      m_name(m_stored.name),
      m_link(*this) {
    m_adapter.daemon().objects().add(m_path, deviceInterface<ServedDevice>(), this);
    m_audio = std::make_unique<DeviceAudio>(*this);
    m_audio->serve();
    m_services = std::make_unique<DeviceServices>(*this);
    m_services->serve();
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
    m_services->abandon();
    const auto end = [&](auto& work) {
        if (!work)
            return;
        work->abandon();
        daemon.bury(std::move(work));
    };
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

void ServedDevice::keep() {
    m_temporary = false;
    m_stored.known = true;
}

bool ServedDevice::offers(const std::string& uuid) const {
    const auto& known = m_stored.uuids;
    return std::find(known.begin(), known.end(), fullUuid(uuid)) != known.end();
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
    if (value.flag() == m_stored.blocked)
        return call->reply();
    m_stored.blocked = value.flag();
    changed("Blocked", value);
    call->reply();
    if (m_stored.blocked)
        m_link.drop();
}

void ServedDevice::discoverServices(const CallPtr& call) {
    if (m_search)
        return call->fail(Errors::inProgress);
    const std::string pattern = call->text(0);
    const std::string uuid = pattern.empty() ? "" : uuidOfPattern(pattern);
    if (!pattern.empty() && uuid.empty())
        return call->fail(Errors::invalidArguments);
    if (!m_adapter.mode().powered())
        return call->fail(Errors::failed("No route to host"));
    startSearch(call, uuid);
}

void ServedDevice::startSearch(const CallPtr& call, const std::string& uuid) {
    m_reverseSearch.stop();
    m_search = std::make_shared<ServiceSearch>(*this, call, uuid);
    m_search->begin();
}

void ServedDevice::cancelDiscovery(const CallPtr& call) {
    if (!m_search)
        return call->fail(Errors::doesNotExist);
    if (!m_search->isDiscovering() || m_search->owner() != call->sender())
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
    startSearch(call);
}

void ServedDevice::pair(const CallPtr& call) {
    m_pairing = DevicePairing::outgoing(*this, call);
    m_pairing->begin();
}

void ServedDevice::comeIn(bool pairing) {
    m_link.accept(!pairing);
    if (!pairing)
        return startReverseSearch();
    m_pairing = DevicePairing::incoming(*this);
    m_pairing->begin();
}

/// We leave the other side its time to search ours before.
void ServedDevice::startReverseSearch() {
    const Times& times = m_adapter.daemon().times();
    m_reverseSearch.start(times.scaled(times.reverseSearch), [this] {
        if (!m_search)
            startSearch(nullptr);
    });
}

void ServedDevice::pairingEnded() {
    m_adapter.daemon().bury(std::move(m_pairing));
}

void ServedDevice::pairingSucceeded(const CallPtr& call) {
    if (!call)
        startReverseSearch();
    else if (!m_search)
        startSearch(call);
    // Else the call is never answered: so does the daemon while another search runs.
}

void ServedDevice::searchEnded() {
    m_adapter.daemon().bury(std::move(m_search));
}

void ServedDevice::cancelSearch() {
    if (m_search)
        m_search->cancel();
}

void ServedDevice::announceStored() {
    if (m_stored.blocked)
        changed("Blocked", true);
    if (m_stored.paired)
        changed("Paired", true);
    for (const auto& [name, value] : {std::pair("Vendor", m_stored.vendor),
                                      {"Product", m_stored.product},
                                      {"Version", m_stored.version}})
        if (value)
            changed(name, *value);
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

void ServedDevice::learnId(const PeerDevice& peer) {
    const auto learn = [this](const char* name, std::optional<guint16>& known,
                              const std::optional<guint16>& value) {
        if (value.value_or(0) == known.value_or(0))
            return;
        known = value;
        changed(name, value.value_or(0));
    };
    learn("Vendor", m_stored.vendor, peer.vendor);
    learn("Product", m_stored.product, peer.product);
    learn("Version", m_stored.version, peer.version);
}

Value ServedDevice::learnServices(const std::string& uuid) {
    const auto peer = this->peer();
    const auto records = peer ? serviceRecords(*peer, uuid) : std::vector<ServiceRecord>();
    std::set<std::string> uuids;
    if (!uuid.empty() || !peer)
        uuids.insert(m_stored.uuids.begin(), m_stored.uuids.end());
    for (const ServiceRecord& record : records) {
        uuids.insert(record.uuid);
        if (record.uuid == fullUuid("1200"))
            learnId(*peer);
    }
    std::vector<std::string> sorted(uuids.begin(), uuids.end());
    if (sorted != m_stored.uuids) {
        m_stored.uuids = std::move(sorted);
        m_audio->serve();
        m_services->serve();
        changed("UUIDs", listValue("s", m_stored.uuids));
    }
    return recordValues(records);
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
    m_services->linkLost();
    if (m_search)
        m_search->linkLost();
    if (m_pairing)
        m_pairing->linkLost();
    else if (m_temporary)
        m_adapter.forgetDevice(alive);
}

void ServedDevice::clientGone(const std::string& client) {
    const auto alive = shared_from_this();
    m_audio->clientGone(client);
    m_services->clientGone(client);
    if (m_search && m_search->owner() == client)
        m_search->ownerGone();
    if (m_pairing && m_pairing->owner() == client)
        m_pairing->ownerGone();
}

} // namespace Bluetooth::Sim
