// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/served_adapter.h"

#include "daemon/adapter_services.h"
#include "daemon/audio/adapter_media.h"
#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/device_pairing.h"
#include "daemon/served_device.h"
#include "daemon/service_search.h"
#include "serving/bluez4/address.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr std::size_t longestName = 248;

} // namespace

ServedAdapter::ServedAdapter(Bluetoothd& daemon, std::shared_ptr<AdapterHardware> hardware)
    : m_daemon(daemon),
      m_hardware(std::move(hardware)),
      m_path(daemon.basePath() + "/" + m_hardware->id()),
      m_mode(*this),
      m_discovery(*this) {
    m_daemon.objects().add(m_path, adapterInterface<ServedAdapter>(), this);
    m_media = std::make_unique<AdapterMedia>(*this);
    m_services = std::make_unique<AdapterServices>(*this);
    for (auto& [address, stored] : m_hardware->storage) {
        if (!stored.known)
            continue;
        m_devices.push_back(std::make_shared<ServedDevice>(*this, address));
        m_devices.back()->setTemporary(false);
    }
}

ServedAdapter::~ServedAdapter() {
    m_devices.clear();
    m_daemon.objects().remove(m_path);
}

void ServedAdapter::announce() {
    for (const auto& device : m_devices)
        device->announceStored();
}

void ServedAdapter::comeUp() {
    m_mode.comeUp();
}

void ServedAdapter::goDown() {
    m_mode.goDown();
    for (const auto& device : m_devices)
        device->retire();
    m_services->retire();
    m_daemon.objects().remove(m_path);
}

void ServedAdapter::loseDevices() {
    const auto devices = m_devices;
    for (const auto& device : devices) {
        if (device->pairing())
            device->pairing()->powerLost();
        device->link().powerLost();
    }
}

void ServedAdapter::clientGone(const std::string& client) {
    m_discovery.clientGone(client);
    m_mode.clientGone(client);
    m_media->clientGone(client);
    m_services->clientGone(client);
    const auto devices = m_devices;
    for (const auto& device : devices)
        device->clientGone(client);
    if (m_agent && m_agent->owner() == client) {
        const auto agent = std::move(m_agent);
        agent->failRequest();
    }
}

void ServedAdapter::releaseAgents() {
    for (const auto& device : m_devices) {
        device->audio().releaseAgent();
        if (device->pairing())
            device->pairing()->releaseAgent();
    }
    m_media->release();
    if (m_agent)
        m_agent->release();
}

const ClientAgent* ServedAdapter::currentAgent() const {
    for (const auto& device : m_devices)
        if (device->pairing() && device->pairing()->agent())
            return device->pairing()->agent();
    return m_agent.get();
}

std::shared_ptr<PeerDevice> ServedAdapter::peerAt(const std::string& address) const {
    auto peer = m_daemon.world().peer(address);
    if (peer && !peer->adapter.empty() && peer->adapter != m_hardware->id())
        return nullptr;
    return peer;
}

std::shared_ptr<ServedDevice> ServedAdapter::find(const std::string& address) const {
    const auto found = std::find_if(m_devices.begin(), m_devices.end(), [&](const auto& device) {
        return device->address() == address;
    });
    return found == m_devices.end() ? nullptr : *found;
}

std::shared_ptr<ServedDevice> ServedAdapter::addDevice(const std::string& address) {
    auto device = std::make_shared<ServedDevice>(*this, address);
    m_devices.push_back(device);
    device->announceStored();
    emit("DeviceCreated", tuple(pathValue(device->path())));
    devicesChanged();
    return device;
}

void ServedAdapter::forgetDevice(const std::shared_ptr<ServedDevice>& device) {
    const auto found = std::find(m_devices.begin(), m_devices.end(), device);
    if (found == m_devices.end())
        return;
    m_devices.erase(found);
    device->audio().releaseAgent();
    devicesChanged();
    emit("DeviceRemoved", tuple(pathValue(device->path())));
    device->cancelSearch();
    device->retire();
    // Alias, class and name are kept apart from the device.
    StoredDevice& stored = device->stored();
    stored.known = false;
    stored.paired = false;
    stored.trusted = false;
    stored.blocked = false;
    stored.uuids.clear();
    m_daemon.bury(device);
}

void ServedAdapter::learnClass(const PeerDevice& peer) {
    StoredDevice& stored = m_hardware->storage[peer.address];
    if (peer.deviceClass == 0 || stored.deviceClass == peer.deviceClass)
        return;
    stored.deviceClass = peer.deviceClass;
    if (const auto device = find(peer.address))
        device->changed("Class", peer.deviceClass);
}

void ServedAdapter::emit(const char* member, const Value& arguments) {
    m_daemon.bus().emit(m_path, Interfaces::adapter, member, arguments);
}

void ServedAdapter::changed(const char* property, const Value& value) {
    emit("PropertyChanged", propertyChange(property, value));
}

void ServedAdapter::uuidsChanged() {
    changed("UUIDs", uuids());
}

Value ServedAdapter::uuids() const {
    return listValue("s", m_daemon.records().uuids(m_hardware->id()));
}

void ServedAdapter::devicesChanged() {
    changed("Devices", devicePaths());
}

Value ServedAdapter::devicePaths() const {
    std::vector<std::string> paths;
    for (const auto& device : m_devices)
        paths.push_back(device->path());
    return listValue("o", paths);
}

void ServedAdapter::getProperties(const CallPtr& call) {
    DictBuilder properties;
    properties.add("Address", m_hardware->address)
        .add("Name", m_hardware->name)
        .add("Class", m_mode.deviceClass())
        .add("Powered", m_mode.powered())
        .add("Discoverable", m_mode.discoverable())
        .add("Pairable", m_mode.pairable())
        .add("DiscoverableTimeout", m_hardware->discoverableTimeout)
        .add("PairableTimeout", m_hardware->pairableTimeout)
        .add("Discovering", m_discovery.active())
        .add("Devices", devicePaths())
        .add("UUIDs", uuids());
    call->reply(tuple(properties.end()));
}

void ServedAdapter::setProperty(const CallPtr& call) {
    const bool answered =
        setOneOf({{"Name", "s", &ServedAdapter::setName}}, *this, call) ||
        setOneOf({{"Powered", "b", &AdapterMode::setPowered},
                  {"Discoverable", "b", &AdapterMode::setDiscoverable},
                  {"Pairable", "b", &AdapterMode::setPairable},
                  {"DiscoverableTimeout", "u", &AdapterMode::setDiscoverableTimeout},
                  {"PairableTimeout", "u", &AdapterMode::setPairableTimeout}},
                 m_mode, call);
    if (!answered)
        call->fail(Errors::invalidArguments);
}

void ServedAdapter::setName(const CallPtr& call, const Value& value) {
    const std::string name = value.text().substr(0, longestName);
    // It may have been cut within a character.
    if (!g_utf8_validate(name.c_str(), -1, nullptr))
        return call->fail(Errors::invalidArguments);
    call->reply();
    if (name == m_hardware->name)
        return;
    m_hardware->name = name;
    if (m_mode.powered())
        changed("Name", name);
}

void ServedAdapter::requestSession(const CallPtr& call) {
    m_mode.requestSession(call);
}

void ServedAdapter::releaseSession(const CallPtr& call) {
    m_mode.releaseSession(call);
}

void ServedAdapter::startDiscovery(const CallPtr& call) {
    if (!m_mode.powered())
        return call->fail(Errors::notReady);
    m_discovery.startSession(call);
}

void ServedAdapter::stopDiscovery(const CallPtr& call) {
    if (!m_mode.powered())
        return call->fail(Errors::notReady);
    m_discovery.stopSession(call);
}

void ServedAdapter::listDevices(const CallPtr& call) {
    call->reply(tuple(devicePaths()));
}

void ServedAdapter::createDevice(const CallPtr& call) {
    const std::string address = call->text(0);
    if (!isAddress(address))
        return call->fail(Errors::invalidArguments);
    if (!m_mode.powered())
        return call->fail(Errors::notReady);
    if (find(upperCase(address)))
        return call->fail(Errors::alreadyExists);
    addDevice(upperCase(address))->create(call);
}

void ServedAdapter::createPairedDevice(const CallPtr& call) {
    const std::string address = call->text(0);
    if (!isAddress(address))
        return call->fail(Errors::invalidArguments);
    if (!m_mode.powered())
        return call->fail(Errors::notReady);
    const bool isOurAgent =
        m_agent && m_agent->owner() == call->sender() && m_agent->path() == call->text(1);
    if (isOurAgent || !parseCapability(call->text(2)))
        return call->fail(Errors::invalidArguments);
    auto device = find(upperCase(address));
    if (device && device->pairing())
        return call->fail(Errors::inProgress);
    if (device && device->stored().paired)
        return call->fail(Errors::alreadyExists);
    if (!device)
        device = addDevice(upperCase(address));
    device->pair(call);
}

void ServedAdapter::cancelDeviceCreation(const CallPtr& call) {
    const std::string address = call->text(0);
    if (!isAddress(address))
        return call->fail(Errors::invalidArguments);
    const auto device = find(upperCase(address));
    const DevicePairing* pairing = device ? device->pairing() : nullptr;
    const ServiceSearch* search = device ? device->search() : nullptr;
    std::string owner = pairing ? pairing->owner() : "";
    if (owner.empty() && search && search->isCreating())
        owner = search->owner();
    if (owner.empty())
        return call->fail(Errors::doesNotExist);
    if (owner != call->sender())
        return call->fail(Errors::notAuthorized);
    device->setTemporary(true);
    if (pairing)
        return device->pairing()->cancel(call);
    if (device->link().up())
        return device->link().requestDisconnect(call);
    forgetDevice(device);
    call->reply();
}

void ServedAdapter::removeDevice(const CallPtr& call) {
    const std::string path = call->text(0);
    const auto found = std::find_if(m_devices.begin(), m_devices.end(), [&](const auto& device) {
        return g_ascii_strcasecmp(device->path().c_str(), path.c_str()) == 0;
    });
    if (found == m_devices.end())
        return call->fail(Errors::doesNotExist);
    const auto device = *found;
    if (device->temporary() || device->pairing() || device->busy())
        return call->fail(BluezError{"DoesNotExist", "Device creation in progress"});
    if (!device->link().up()) {
        forgetDevice(device);
        return call->reply();
    }
    device->setTemporary(true);
    device->link().requestDisconnect(call);
}

void ServedAdapter::findDevice(const CallPtr& call) {
    const auto device = find(upperCase(call->text(0)));
    if (!device)
        return call->fail(Errors::doesNotExist);
    call->reply(tuple(pathValue(device->path())));
}

void ServedAdapter::registerAgent(const CallPtr& call) {
    if (m_agent)
        return call->fail(Errors::alreadyExists);
    const auto capability = parseCapability(call->text(1));
    if (!capability)
        return call->fail(Errors::invalidArguments);
    m_agent =
        std::make_shared<ClientAgent>(m_daemon.bus(), call->sender(), call->text(0), *capability);
    call->reply();
}

void ServedAdapter::unregisterAgent(const CallPtr& call) {
    if (!m_agent || m_agent->owner() != call->sender() || m_agent->path() != call->text(0))
        return call->fail(Errors::doesNotExist);
    const auto agent = std::move(m_agent);
    agent->release();
    call->reply();
    agent->failRequest();
}

} // namespace Bluetooth::Sim
