// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/control.h>

#include "bluez/factory.h"
#include "bluez/print.h"
#include "core/method_call.h"

namespace Bluetooth {

Control::Control(const char* path) : BluezObject(path, "org.bluez.Control") {}

Control::~Control() {
    unsubscribeAll();
}

Control* Control::getControl(const char* path) {
    return makeProxy<Control>(path);
}

int Control::isConnected(bool& connected) {
    return readMethod(KES_HERE, *this, "IsConnected", connected) ? 0 : -1;
}

int Control::volumeDown() {
    return callMethod(KES_HERE, *this, "VolumeDown");
}

int Control::volumeUp() {
    return callMethod(KES_HERE, *this, "VolumeUp");
}

int Control::setConnectedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Connected", callback ? callback : connectedHandler);
}

int Control::setDisconnectedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Disconnected", callback ? callback : disconnectedHandler);
}

void Control::connectedHandler(RemoteObject* sender) {
    printLine({"Connected from ", sender->getPath()});
}

void Control::disconnectedHandler(RemoteObject* sender) {
    printLine({"Disconnected from ", sender->getPath()});
}

} // namespace Bluetooth
