#include "daemon/device.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/audio_device.h"
#include "daemon/daemon.h"
#include "daemon/device_creation.h"
#include "daemon/pairing.h"
#include "daemon/service_search.h"
#include "world/address.h"
#include "world/icon.h"

#include <algorithm>

namespace Bluetooth::Sim {

const Interface& Device::table() {
    static const Interface table = {
        "org.bluez.Device",
        {{"GetProperties", {}, {{"properties", "a{sv}"}}, handle<&Device::getProperties>},
         {"SetProperty", {{"name", "s"}, {"value", "v"}}, {}, handle<&Device::setProperty>},
         {"DiscoverServices",
          {{"pattern", "s"}},
          {{"services", "a{us}"}},
          handle<&Device::discoverServices>},
         {"CancelDiscovery", {}, {}, handle<&Device::cancelDiscovery>},
         {"Disconnect", {}, {}, handle<&Device::disconnect>}},
        {{"PropertyChanged", {{"name", "s"}, {"value", "v"}}}, {"DisconnectRequested", {}}}};
    return table;
}

Device::Device(Adapter& adapter, std::string address)
    : adapter_(adapter),
      address_(std::move(address)),
      path_(adapter.path() + "/dev_" + withSeparator(address_, '_')),
      stored_(adapter.hardware().storage[address_]),
      classKnown_(stored_.deviceClass.has_value()),
      name_(stored_.name),
      link_(*this) {
    adapter_.daemon().objects().add(path_, table(), this);
    audio_ = std::make_unique<AudioDevice>(*this);
    audio_->serve();
}

Device::~Device() {
    retire();
}

void Device::retire() {
    if (retired_)
        return;
    retired_ = true;
    link_.abandon();
    reverseSearch_.stop();
    Daemon& daemon = adapter_.daemon();
    audio_->abandon();
    if (creation_)
        daemon.bury(std::move(creation_));
    if (pairing_)
        daemon.bury(std::move(pairing_));
    if (search_)
        daemon.bury(std::move(search_));
    daemon.objects().remove(path_);
}

std::shared_ptr<Peer> Device::peer() const {
    return adapter_.peerAt(address_);
}

bool Device::reachable() const {
    const auto peer = this->peer();
    return peer && peer->present && peer->connectable && !stored_.blocked;
}

bool Device::busy() const {
    return creation_ || pairing_ || search_;
}

void Device::emit(const char* member, const Value& arguments) {
    adapter_.daemon().bus().emit(path_, table().name, member, arguments);
}

void Device::changed(const char* property, const Value& value) {
    emit("PropertyChanged", g_variant_new("(sv)", property, value.get()));
}

std::string Device::alias() const {
    if (!stored_.alias.empty())
        return stored_.alias;
    return name_.empty() ? withSeparator(address_, '-') : name_;
}

void Device::getProperties(const CallPtr& call) {
    Dict properties;
    properties.add("Address", textValue(address_));
    properties.add("Name", textValue(name_));
    properties.add("Alias", textValue(alias()));
    if (stored_.deviceClass) {
        properties.add("Class", g_variant_new_uint32(*stored_.deviceClass));
        if (const char* icon = iconOf(*stored_.deviceClass))
            properties.add("Icon", g_variant_new_string(icon));
    }
    if (stored_.vendor)
        properties.add("Vendor", g_variant_new_uint16(*stored_.vendor));
    if (stored_.product)
        properties.add("Product", g_variant_new_uint16(*stored_.product));
    if (stored_.version)
        properties.add("Version", g_variant_new_uint16(*stored_.version));
    properties.add("Paired", boolValue(stored_.paired))
        .add("Trusted", boolValue(stored_.trusted))
        .add("Blocked", boolValue(stored_.blocked))
        .add("Connected", boolValue(link_.up()))
        .add("UUIDs", listValue("s", stored_.uuids))
        .add("Services", listValue("o", {}))
        .add("Adapter", pathValue(adapter_.path()));
    call->reply(tuple(properties.end()));
}

void Device::setProperty(const CallPtr& call) {
    const std::string name = call->text(0);
    const Value value = call->content(1);
    if (name == "Alias" && value.is("s"))
        return setAlias(call, value);
    if (name == "Trusted" && value.is("b"))
        return setTrusted(call, value);
    if (name == "Blocked" && value.is("b"))
        return setBlocked(call, value);
    call->fail(Errors::invalidArguments());
}

void Device::setAlias(const CallPtr& call, const Value& value) {
    const std::string alias = g_variant_get_string(value.get(), nullptr);
    if (alias != stored_.alias) {
        stored_.alias = alias;
        // Sent as it was given: "" too, though the name stands for it from now on.
        changed("Alias", value);
    }
    call->reply();
}

void Device::setTrusted(const CallPtr& call, const Value& value) {
    const bool trusted = g_variant_get_boolean(value.get()) != FALSE;
    if (trusted != stored_.trusted) {
        stored_.trusted = trusted;
        changed("Trusted", value);
    }
    call->reply();
}

void Device::setBlocked(const CallPtr& call, const Value& value) {
    const bool blocked = g_variant_get_boolean(value.get()) != FALSE;
    if (blocked != stored_.blocked) {
        stored_.blocked = blocked;
        if (blocked)
            link_.drop();
        changed("Blocked", value);
    }
    call->reply();
}

void Device::discoverServices(const CallPtr& call) {
    if (busy())
        return call->fail(Errors::inProgress());
    search_ = ServiceSearch::begin(*this, call);
}

void Device::cancelDiscovery(const CallPtr& call) {
    if (!search_)
        return call->fail(Errors::doesNotExist());
    if (search_->owner() != call->sender())
        return call->fail(Errors::notAuthorized());
    search_->cancel();
    call->reply();
}

void Device::disconnect(const CallPtr& call) {
    if (!link_.up())
        return call->fail(Errors::notConnected());
    link_.requestDisconnect(call);
}

void Device::create(const CallPtr& call) {
    creation_ = std::make_shared<DeviceCreation>(*this, call);
    creation_->begin();
}

void Device::pair(const CallPtr& call) {
    pairing_ = Pairing::outgoing(*this, call);
    pairing_->begin();
}

void Device::comeIn(bool pairing) {
    const Times& times = adapter_.daemon().times();
    link_.accept();
    if (pairing) {
        pairing_ = Pairing::incoming(*this);
        pairing_->begin();
        return;
    }
    link_.hold();
    reverseSearch_.start(times.scaled(times.reverseSearch), [this] { learnServices(); });
}

void Device::creationEnded() {
    adapter_.daemon().bury(std::move(creation_));
}

void Device::pairingEnded() {
    adapter_.daemon().bury(std::move(pairing_));
}

void Device::searchEnded() {
    adapter_.daemon().bury(std::move(search_));
}

void Device::seen() {
    if (!classKnown_) {
        classKnown_ = true;
        changed("Class", g_variant_new_uint32(*stored_.deviceClass));
        if (const char* icon = iconOf(*stored_.deviceClass))
            changed("Icon", g_variant_new_string(icon));
    }
    learnName();
}

void Device::learnName() {
    const auto peer = this->peer();
    if (link_.up() && peer)
        stored_.name = peer->name;
    if (stored_.name == name_)
        return;
    name_ = stored_.name;
    changed("Name", textValue(name_));
    if (stored_.alias.empty())
        changed("Alias", textValue(alias()));
}

void Device::learnServices() {
    const auto peer = this->peer();
    if (!peer)
        return;
    if (peer->vendor && !stored_.vendor) {
        stored_.vendor = peer->vendor;
        stored_.product = peer->product.value_or(0);
        stored_.version = peer->version.value_or(0);
        changed("Vendor", g_variant_new_uint16(*stored_.vendor));
        changed("Product", g_variant_new_uint16(*stored_.product));
        changed("Version", g_variant_new_uint16(*stored_.version));
    }
    if (stored_.uuids == peer->uuids)
        return;
    stored_.uuids = peer->uuids;
    audio_->serve();
    changed("UUIDs", listValue("s", stored_.uuids));
}

void Device::setPaired(bool paired) {
    if (paired == stored_.paired)
        return;
    stored_.paired = paired;
    changed("Paired", boolValue(paired));
}

void Device::linkLost() {
    const auto alive = shared_from_this();
    reverseSearch_.stop();
    audio_->linkLost();
    if (search_)
        search_->linkLost();
    if (creation_)
        creation_->linkLost();
    else if (pairing_)
        pairing_->linkLost();
    else if (temporary_)
        adapter_.removeDevice(alive);
}

void Device::clientGone(const std::string& client) {
    const auto alive = shared_from_this();
    if (search_ && search_->owner() == client)
        search_->abandon();
    if (creation_ && creation_->owner() == client)
        creation_->ownerGone();
    if (pairing_ && pairing_->owner() == client)
        pairing_->ownerGone();
}

} // namespace Bluetooth::Sim
