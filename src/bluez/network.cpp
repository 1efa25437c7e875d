// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/network.h>

#include "bluez/factory.h"
#include "core/method_call.h"

namespace Bluetooth {

Network::Network(const char* path) : BluezObject(path, "org.bluez.Network") {}

Network::~Network() {
    unsubscribeAll();
}

Network* Network::getNetwork(const char* path) {
    return makeProxy<Network>(path);
}

int Network::connect(const char* uuid, std::string& interface) {
    return readMethod(KES_HERE, *this, "Connect", interface, uuid) ? 0 : -1;
}

int Network::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

} // namespace Bluetooth
