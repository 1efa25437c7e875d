// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/device.h>

#include "bluez/factory.h"
#include "bluez/print.h"
#include "core/method_call.h"

namespace Bluetooth {

Device::Device(const char* path) : BluezObject(path, "org.bluez.Device") {}

Device::~Device() {
    unsubscribeAll();
}

Device* Device::getDevice(const char* path) {
    return makeProxy<Device>(path);
}

Dict* Device::discoverServices(const char* pattern) {
    return readDict(KES_HERE, *this, "DiscoverServices", pattern);
}

int Device::cancelDiscovery() {
    return callMethod(KES_HERE, *this, "CancelDiscovery");
}

int Device::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

int Device::setDisconnectRequestedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("DisconnectRequested",
                                      callback ? callback : disconnectRequestedHandler);
}

void Device::disconnectRequestedHandler(RemoteObject* sender) {
    printLine({"Disconnect requested from ", sender->getPath()});
}

} // namespace Bluetooth
