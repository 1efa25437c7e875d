// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/adapter.h>

#include <bluetooth/agent.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>
#include <bluetooth/dict_codec.h>

#include "bluez/device_paths.h"
#include "bluez/factory.h"
#include "bluez/hci_version.h"
#include "bluez/print.h"
#include "core/method_call.h"

#include <memory>
#include <sstream>
#include <string>
#include <vector>

namespace Bluetooth {

namespace {

std::string pointerText(const ObjectPath* path) {
    std::ostringstream text;
    text << static_cast<const void*>(path);
    return text.str();
}

} // namespace

bool readDevicePaths(LogPlace place, Adapter& adapter, std::vector<ObjectPath>& paths) {
    return readMethod(place, adapter, "ListDevices", paths);
}

Adapter::Adapter(const char* path) : BluezObject(path, "org.bluez.Adapter") {}

Adapter::~Adapter() {
    unsubscribeAll();
}

Adapter* Adapter::getAdapter(const char* path) {
    return makeProxy<Adapter>(path);
}

Dict* Adapter::getProperties() {
    std::unique_ptr<Dict> properties(BluezObject::getProperties());
    if (!properties)
        return nullptr;
    const std::string name = controllerName(getPath());
    std::string version;
    if (readHciVersion(name, version))
        properties->emplace_back("HCIVersion", version);
    else
        logError(KES_HERE, "Failed to get open(%s %s)", hciconfigProgram, name.c_str());
    return properties.release();
}

int Adapter::requestSession() {
    return callMethod(KES_HERE, *this, "RequestSession");
}

int Adapter::releaseSession() {
    return callMethod(KES_HERE, *this, "ReleaseSession");
}

int Adapter::startDiscovery() {
    return callMethod(KES_HERE, *this, "StartDiscovery");
}

int Adapter::stopDiscovery() {
    return callMethod(KES_HERE, *this, "StopDiscovery");
}

Device* Adapter::findDevice(const char* address, bool logError) {
    resetError();
    ObjectPath path;
    const bool found = askFor(*this, "FindDevice", path, address);
    // A program that only asks whether a device is known does not fill the log.
    if (logError)
        logAnyError(KES_HERE, *this);
    return found ? Device::getDevice(path) : nullptr;
}

Device* Adapter::getDeviceByIndex(unsigned int index) {
    std::vector<ObjectPath> paths;
    return readDevicePaths(KES_HERE, *this, paths) && index < paths.size()
               ? Device::getDevice(paths[index])
               : nullptr;
}

DeviceList* Adapter::listDevices() {
    std::vector<ObjectPath> paths;
    return readDevicePaths(KES_HERE, *this, paths) ? makeList<Device, DeviceList>(paths) : nullptr;
}

Device* Adapter::createDevice(const char* address) {
    ObjectPath path;
    return readMethod(KES_HERE, *this, "CreateDevice", path, address) ? Device::getDevice(path)
                                                                      : nullptr;
}

Device* Adapter::createPairedDevice(const char* address, const Agent& agent) {
    resetError();
    ObjectPath path;
    // Not readMethod(): the daemon asks the agent before it replies, so the connection must be
    // dispatched, and for as long as it takes.
    const bool paired = beginCall(*this, "CreatePairedDevice", address, ObjectPath(agent.getPath()),
                                  agent.getCapability()) &&
                        sendMessagePending() >= 0 && getReplyValue(path) >= 0;
    logAnyError(KES_HERE, *this);
    return paired ? Device::getDevice(path) : nullptr;
}

int Adapter::cancelDeviceCreation(const char* address) {
    return callMethod(KES_HERE, *this, "CancelDeviceCreation", address);
}

int Adapter::removeDevice(const char* devicePath) {
    return callMethod(KES_HERE, *this, "RemoveDevice", ObjectPath(devicePath ? devicePath : ""));
}

int Adapter::registerAgent(const Agent& agent) {
    return callMethod(KES_HERE, *this, "RegisterAgent", ObjectPath(agent.getPath()),
                      agent.getCapability());
}

int Adapter::unregisterAgent(const Agent& agent) {
    return callMethod(KES_HERE, *this, "UnregisterAgent", ObjectPath(agent.getPath()));
}

int Adapter::setDeviceFoundHandler(StringDictCallback callback) {
    return setSignalHandlerStringDict("DeviceFound", callback ? callback : deviceFoundHandler);
}

int Adapter::setDeviceDisappearedHandler(StringCallback callback) {
    return setSignalHandlerString("DeviceDisappeared",
                                  callback ? callback : deviceDisappearedHandler);
}

int Adapter::setDeviceCreatedHandler(ObjectPathCallback callback) {
    return setSignalHandlerObjectPath("DeviceCreated", callback ? callback : deviceCreatedHandler);
}

int Adapter::setDeviceRemovedHandler(ObjectPathCallback callback) {
    return setSignalHandlerObjectPath("DeviceRemoved", callback ? callback : deviceRemovedHandler);
}

void Adapter::deviceFoundHandler(RemoteObject* sender, const char* address,
                                 const Dict* properties) {
    printLine({address, " was found by ", sender->getPath()});
    printLine({dictToString(*properties)});
}

void Adapter::deviceDisappearedHandler(RemoteObject* sender, const char* address) {
    printLine({address, " was disappeared in ", sender->getPath()});
}

// These two print the pointer, not the path: programs that read this output know it so.
void Adapter::deviceCreatedHandler(RemoteObject* sender, const ObjectPath* device) {
    printLine({pointerText(device), " was created by ", sender->getPath()});
}

void Adapter::deviceRemovedHandler(RemoteObject* sender, const ObjectPath* device) {
    printLine({pointerText(device), " was removed by ", sender->getPath()});
}

} // namespace Bluetooth
