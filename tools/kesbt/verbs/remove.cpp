// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

namespace {

void removeDevice(const Options& options, const std::string& address) {
    const auto adapter = openAdapter(options);
    const auto device = openDevice(*adapter, address);
    ask(options, "cannot remove " + address, *adapter, "RemoveDevice",
        Bluetooth::ObjectPath(device->getPath()));

    const auto isGone = [&] {
        return !findDevice(*adapter, address) && failedWith(*adapter, "DoesNotExist");
    };
    if (!waitUntil(isGone, options.limit.step()))
        throw notConfirmed(address + " is still known to " + adapterName(*adapter));
    if (options.json)
        printDocument({{"address", address},
                       {"adapter", adapterName(*adapter)},
                       {"path", device->getPath()},
                       {"removed", true}});
    else
        std::cout << "Removed " << address << " from " << adapterName(*adapter) << '\n';
}

} // namespace

const Verb removeVerb = {"remove",
                         "Devices",
                         "Forget a device and its pairing",
                         "kesbt remove 00:11:22:33:44:55",
                         {{Limit::Steps, oneDevice(removeDevice, knownDevices)}}};

} // namespace Kesbt
