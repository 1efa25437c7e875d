#include "daemon/adapter.h"

#include "bus/dict.h"
#include "daemon/agent.h"
#include "daemon/daemon.h"
#include "daemon/device.h"
#include "daemon/device_creation.h"
#include "daemon/pairing.h"
#include "world/address.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr std::size_t kLongestName = 248;

/// Cuts a name to what a controller stores, between two characters.
std::string cut(const std::string& name) {
    if (name.size() <= kLongestName)
        return name;
    const char* end = name.c_str() + kLongestName;
    const gchar* valid = nullptr;
    g_utf8_validate(name.c_str(), end - name.c_str(), &valid);
    return {name.c_str(), valid};
}

} // namespace

const Interface& Adapter::table() {
    static const Interface table = {
        "org.bluez.Adapter",
        {{"GetProperties", {}, {{"properties", "a{sv}"}}, handle<&Adapter::getProperties>},
         {"SetProperty", {{"name", "s"}, {"value", "v"}}, {}, handle<&Adapter::setProperty>},
         {"RequestSession", {}, {}, handle<&Adapter::requestSession>},
         {"ReleaseSession", {}, {}, handle<&Adapter::releaseSession>},
         {"StartDiscovery", {}, {}, handle<&Adapter::startDiscovery>},
         {"StopDiscovery", {}, {}, handle<&Adapter::stopDiscovery>},
         {"ListDevices", {}, {{"devices", "ao"}}, handle<&Adapter::listDevices>, true},
         {"CreateDevice",
          {{"address", "s"}},
          {{"device", "o"}},
          handle<&Adapter::createDeviceCalled>},
         {"CreatePairedDevice",
          {{"address", "s"}, {"agent", "o"}, {"capability", "s"}},
          {{"device", "o"}},
          handle<&Adapter::createPairedDevice>},
         {"CancelDeviceCreation", {{"address", "s"}}, {}, handle<&Adapter::cancelDeviceCreation>},
         {"RemoveDevice", {{"device", "o"}}, {}, handle<&Adapter::removeDeviceCalled>},
         {"FindDevice", {{"address", "s"}}, {{"device", "o"}}, handle<&Adapter::findDevice>},
         {"RegisterAgent",
          {{"agent", "o"}, {"capability", "s"}},
          {},
          handle<&Adapter::registerAgent>},
         {"UnregisterAgent", {{"agent", "o"}}, {}, handle<&Adapter::unregisterAgent>}},
        {{"PropertyChanged", {{"name", "s"}, {"value", "v"}}},
         {"DeviceCreated", {{"device", "o"}}},
         {"DeviceRemoved", {{"device", "o"}}},
         {"DeviceFound", {{"address", "s"}, {"values", "a{sv}"}}},
         {"DeviceDisappeared", {{"address", "s"}}}}};
    return table;
}

Adapter::Adapter(Daemon& daemon, std::shared_ptr<AdapterHardware> hardware)
    : daemon_(daemon),
      hardware_(std::move(hardware)),
      path_(daemon.basePath() + "/" + hardware_->id()),
      mode_(*this),
      discovery_(*this) {
    daemon_.objects().add(path_, table(), this);
    for (auto& [address, stored] : hardware_->storage) {
        if (!stored.known)
            continue;
        devices_.push_back(std::make_shared<Device>(*this, address));
        devices_.back()->setTemporary(false);
    }
}

Adapter::~Adapter() {
    devices_.clear();
    daemon_.objects().remove(path_);
}

void Adapter::announce() {
    for (const auto& device : devices_)
        if (device->stored().paired)
            device->changed("Paired", boolValue(true));
}

void Adapter::comeUp() {
    mode_.comeUp();
}

void Adapter::goDown() {
    mode_.goDown();
    releaseAgents();
    agent_.reset();
    for (const auto& device : devices_)
        device->retire();
    daemon_.objects().remove(path_);
}

void Adapter::loseDevices() {
    const auto devices = devices_;
    for (const auto& device : devices) {
        if (device->pairing())
            device->pairing()->powerLost();
        else if (device->creation())
            device->creation()->powerLost();
        device->link().drop();
    }
}

void Adapter::clientGone(const std::string& client) {
    discovery_.clientGone(client);
    mode_.clientGone(client);
    const auto devices = devices_;
    for (const auto& device : devices)
        device->clientGone(client);
    if (agent_ && agent_->owner() == client) {
        const auto agent = std::move(agent_);
        agent->ownerGone();
    }
}

void Adapter::releaseAgents() {
    for (const auto& device : devices_)
        if (device->pairing())
            device->pairing()->releaseAgent();
    if (agent_)
        agent_->release();
}

const Agent* Adapter::currentAgent() const {
    for (const auto& device : devices_)
        if (device->pairing() && device->pairing()->agent())
            return device->pairing()->agent();
    return agent_.get();
}

std::shared_ptr<Peer> Adapter::peerAt(const std::string& address) const {
    auto peer = daemon_.world().peer(address);
    if (peer && !peer->adapter.empty() && peer->adapter != hardware_->id())
        return nullptr;
    return peer;
}

std::shared_ptr<Device> Adapter::find(const std::string& address) const {
    const auto found = std::find_if(devices_.begin(), devices_.end(), [&](const auto& device) {
        return device->address() == address;
    });
    return found == devices_.end() ? nullptr : *found;
}

std::shared_ptr<Device> Adapter::createDevice(const std::string& address) {
    auto device = std::make_shared<Device>(*this, address);
    devices_.push_back(device);
    emit("DeviceCreated", tuple(pathValue(device->path())));
    devicesChanged();
    return device;
}

void Adapter::removeDevice(const std::shared_ptr<Device>& device) {
    const auto found = std::find(devices_.begin(), devices_.end(), device);
    if (found == devices_.end())
        return;
    devices_.erase(found);
    device->retire();
    devicesChanged();
    emit("DeviceRemoved", tuple(pathValue(device->path())));
    // Alias, class and name are kept apart from the device.
    StoredDevice& stored = device->stored();
    stored.known = false;
    stored.paired = false;
    stored.trusted = false;
    stored.blocked = false;
    stored.uuids.clear();
    daemon_.bury(device);
}

void Adapter::emit(const char* member, const Value& arguments) {
    daemon_.bus().emit(path_, table().name, member, arguments);
}

void Adapter::changed(const char* property, const Value& value) {
    emit("PropertyChanged", g_variant_new("(sv)", property, value.get()));
}

void Adapter::uuidsChanged() {
    changed("UUIDs", listValue("s", hardware_->uuids));
}

void Adapter::devicesChanged() {
    changed("Devices", devicePaths());
}

Value Adapter::devicePaths() const {
    std::vector<std::string> paths;
    for (const auto& device : devices_)
        paths.push_back(device->path());
    return listValue("o", paths);
}

void Adapter::getProperties(const CallPtr& call) {
    Dict properties;
    properties.add("Address", textValue(hardware_->address))
        .add("Name", textValue(hardware_->name))
        .add("Class", g_variant_new_uint32(mode_.deviceClass()))
        .add("Powered", boolValue(mode_.powered()))
        .add("Discoverable", boolValue(mode_.discoverable()))
        .add("Pairable", boolValue(mode_.pairable()))
        .add("DiscoverableTimeout", g_variant_new_uint32(hardware_->discoverableTimeout))
        .add("PairableTimeout", g_variant_new_uint32(hardware_->pairableTimeout))
        .add("Discovering", boolValue(discovery_.active()))
        .add("Devices", devicePaths())
        .add("UUIDs", listValue("s", hardware_->uuids));
    call->reply(tuple(properties.end()));
}

void Adapter::setProperty(const CallPtr& call) {
    const std::string name = call->text(0);
    const Value value = call->content(1);
    if (name == "Name" && value.is("s"))
        return setName(call, value);
    if (name == "Powered" && value.is("b"))
        return mode_.setPowered(call, value);
    if (name == "Discoverable" && value.is("b"))
        return mode_.setDiscoverable(call, value);
    if (name == "Pairable" && value.is("b"))
        return mode_.setPairable(call, value);
    if (name == "DiscoverableTimeout" && value.is("u"))
        return mode_.setDiscoverableTimeout(call, value);
    if (name == "PairableTimeout" && value.is("u"))
        return mode_.setPairableTimeout(call, value);
    call->fail(Errors::invalidArguments());
}

void Adapter::setName(const CallPtr& call, const Value& value) {
    const std::string name = cut(g_variant_get_string(value.get(), nullptr));
    call->reply();
    if (name == hardware_->name)
        return;
    hardware_->name = name;
    changed("Name", textValue(name));
}

void Adapter::requestSession(const CallPtr& call) {
    mode_.requestSession(call);
}

void Adapter::releaseSession(const CallPtr& call) {
    mode_.releaseSession(call);
}

void Adapter::startDiscovery(const CallPtr& call) {
    if (!mode_.powered())
        return call->fail(Errors::notReady());
    discovery_.startSession(call);
}

void Adapter::stopDiscovery(const CallPtr& call) {
    if (!mode_.powered())
        return call->fail(Errors::notReady());
    discovery_.stopSession(call);
}

void Adapter::listDevices(const CallPtr& call) {
    call->reply(tuple(devicePaths()));
}

void Adapter::createDeviceCalled(const CallPtr& call) {
    const std::string address = call->text(0);
    if (!isAddress(address))
        return call->fail(Errors::invalidArguments());
    if (!mode_.powered())
        return call->fail(Errors::notReady());
    if (find(upperCase(address)))
        return call->fail(Errors::alreadyExists());
    createDevice(upperCase(address))->create(call);
}

void Adapter::createPairedDevice(const CallPtr& call) {
    const std::string address = call->text(0);
    if (!isAddress(address))
        return call->fail(Errors::invalidArguments());
    if (!mode_.powered())
        return call->fail(Errors::notReady());
    const bool isOurAgent =
        agent_ && agent_->owner() == call->sender() && agent_->path() == call->text(1);
    if (isOurAgent || !parseCapability(call->text(2)))
        return call->fail(Errors::invalidArguments());
    auto device = find(upperCase(address));
    if (device && device->busy())
        return call->fail(Errors::inProgress());
    if (device && device->stored().paired)
        return call->fail(Errors::alreadyExists());
    if (!device)
        device = createDevice(upperCase(address));
    device->pair(call);
}

void Adapter::cancelDeviceCreation(const CallPtr& call) {
    const std::string address = call->text(0);
    if (!isAddress(address))
        return call->fail(Errors::invalidArguments());
    const auto device = find(upperCase(address));
    if (!device || !(device->creation() || device->pairing()))
        return call->fail(Errors::doesNotExist());
    const std::string owner =
        device->creation() ? device->creation()->owner() : device->pairing()->owner();
    if (owner != call->sender())
        return call->fail(Errors::notAuthorized());
    if (device->creation())
        device->creation()->cancel(call);
    else
        device->pairing()->cancel(call);
}

void Adapter::removeDeviceCalled(const CallPtr& call) {
    const std::string path = call->text(0);
    const auto found = std::find_if(devices_.begin(), devices_.end(),
                                    [&](const auto& device) { return device->path() == path; });
    if (found == devices_.end())
        return call->fail(Errors::doesNotExist());
    const auto device = *found;
    if (device->temporary() || device->busy())
        return call->fail(Errors::bluez("DoesNotExist", "Device creation in progress"));
    if (!device->link().up()) {
        removeDevice(device);
        return call->reply();
    }
    device->setTemporary(true);
    device->link().requestDisconnect(call);
}

void Adapter::findDevice(const CallPtr& call) {
    const auto device = find(upperCase(call->text(0)));
    if (!device)
        return call->fail(Errors::doesNotExist());
    call->reply(tuple(pathValue(device->path())));
}

void Adapter::registerAgent(const CallPtr& call) {
    if (agent_)
        return call->fail(Errors::alreadyExists());
    const auto capability = parseCapability(call->text(1));
    if (!capability)
        return call->fail(Errors::invalidArguments());
    agent_ = std::make_shared<Agent>(daemon_.bus(), call->sender(), call->text(0), *capability);
    call->reply();
}

void Adapter::unregisterAgent(const CallPtr& call) {
    if (!agent_ || agent_->owner() != call->sender() || agent_->path() != call->text(0))
        return call->fail(Errors::doesNotExist());
    const auto agent = std::move(agent_);
    agent->release();
    call->reply();
}

} // namespace Bluetooth::Sim
