// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/held_connection.h"
#include "daemon/profile.h"
#include "verbs/list.h"

#include <bluetooth/network.h>

namespace Kesbt {

namespace {

using Bluetooth::Network;

Profile<Network> openNetwork(const Options& options, const std::string& address) {
    return {options, address, Network::getNetwork, "network"};
}

std::string connectNetwork(const Options& options, const std::string& address, Network& network,
                           const std::string& service) {
    const std::string what = "cannot connect the network of " + address;
    try {
        ask(options, what, network, "Connect", service.c_str());
    } catch (const Failure&) {
        if (!lacksObject(network))
            throw;
        // The interface is there, as its properties have shown.
        throw Failure(what + ": this bluetoothd takes no service for it, as that of BlueZ 4.101; "
                             "use another version of BlueZ 4");
    }
    return connectedName(network, address);
}

void connect(const Options& options, const std::string& address, const std::string& service) {
    BusFeed feed(BusFeed::Signals::All);
    const auto network = openNetwork(options, address);
    const HeldConnection held = {address, "interface",
                                 connectNetwork(options, address, *network.proxy, service),
                                 network.proxy->getInterface()};
    held.hold(options, feed, *network.device);
    ask(options, "cannot disconnect the network of " + address, *network.proxy, "Disconnect");
    held.printEnd(options);
}

Action buildConnect(const Syntax& syntax) {
    const auto address = addAddress(syntax, knownDevices);
    auto service = std::make_shared<std::string>("nap");
    syntax.completion.offer(
        syntax.app.add_option("SERVICE", *service, "Its role: nap (default), gn, panu, or a UUID")
            ->type_name(""),
        [](const auto&) {
            return std::vector<std::string>{"gn", "nap", "panu"};
        });
    return [&options = syntax.options, address, service] { connect(options, *address, *service); };
}

void disconnect(const Options& options, const std::string& address) {
    const auto network = openNetwork(options, address);
    setConnected(options, *network.proxy, "the network of " + address, false);
    network.print(options, address, "network");
}

} // namespace

const Verb networkVerb = {
    "network",
    "Devices",
    "Connect to the network that a device shares",
    "kesbt network connect 00:11:22:33:44:55 nap\n"
    "kesbt network disconnect 00:11:22:33:44:55",
    {{"connect", "Connect, print the network interface, and hold it until\nCtrl-C", Limit::Stream,
      buildConnect},
     {"disconnect", "Disconnect; only for the program that connected", Limit::Steps,
      oneDevice(disconnect, knownDevices)}}};

} // namespace Kesbt
