// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"

#include <iostream>

namespace Kesbt {

namespace {

void disconnect(const Options& options, const std::string& address) {
    const auto device = openDevice(options, address);
    const auto isDone = [&] { return !readProperties(*device).value("Connected", false); };
    if (!isDone()) // otherwise the daemon refuses it
        ask(options, "cannot disconnect " + address, *device, "Disconnect");
    if (!waitUntil(isDone, options.limit.step()))
        throw notConfirmed(address + " is not disconnected");
    if (options.json)
        printDocument({{"address", address},
                       {"adapter", adapterName(*device)},
                       {"path", device->getPath()},
                       {"disconnected", true}});
    else
        std::cout << address << " is disconnected from " << adapterName(*device) << '\n';
}

} // namespace

const Verb disconnectVerb = {"disconnect",
                             "Devices",
                             "End all connections with a device",
                             "kesbt disconnect 00:11:22:33:44:55",
                             {{Limit::Steps, oneDevice(disconnect, knownDevices)}}};

} // namespace Kesbt
