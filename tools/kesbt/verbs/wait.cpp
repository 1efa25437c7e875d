// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"
#include "daemon/objects.h"
#include "show/text.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <algorithm>
#include <iostream>

namespace Kesbt {

namespace {

/// What is waited for. Whether it is so is looked at first and after each signal that concerns it:
/// a daemon may send many others.
struct Awaited {
    const char* name;    ///< e.g. "paired"
    std::string subject; ///< an address or an adapter
    std::function<bool()> isReached;
    std::function<bool(const BusSignal&)> isConcerned;
};

bool begins(const Json& arguments, const Json& first) {
    return !arguments.empty() && arguments[0] == first;
}

bool isChange(const BusSignal& signal, const std::string& path, const char* property) {
    return signal.path == path && signal.member == "PropertyChanged" &&
           begins(signal.arguments, property);
}

/// Where the daemon has or will have the device.
std::string devicePath(const Bluetooth::Adapter& adapter, std::string address) {
    std::replace(address.begin(), address.end(), ':', '_');
    return std::string(adapter.getPath()) + "/dev_" + address;
}

bool isRemoval(const BusSignal& signal, const Bluetooth::Adapter& adapter) {
    return signal.member == "AdapterRemoved" && begins(signal.arguments, adapter.getPath());
}

void await(const Options& options, BusFeed& feed, const Bluetooth::Adapter& adapter,
           const Awaited& goal) {
    Interrupt interrupt;
    const auto deadline = options.limit.end();
    bool isTold = false;
    bool isToBeRead = true;
    while (!isToBeRead || !goal.isReached()) {
        if (!isTold)
            printHint("Waiting until " + goal.subject + " is " + goal.name + " (Ctrl-C ends it)");
        isTold = true;
        if (interrupt.came())
            throw Failure("interrupted before " + goal.subject + " was " + goal.name +
                          "; repeat the command to go on waiting");
        if (Clock::now() >= deadline)
            throw notConfirmed(goal.subject + " was not " + goal.name);
        waitForInput({feed.fd(), interrupt.fd()}, deadline);
        isToBeRead = false;
        for (BusSignal signal; feed.next(signal);) {
            if (BusFeed::isDaemonGone(signal))
                throw daemonLost();
            if (isRemoval(signal, adapter))
                throw adapterRemoved(adapterName(adapter));
            isToBeRead = goal.isConcerned(signal) || isToBeRead;
        }
    }
    if (options.json)
        printDocument({{"subject", goal.subject}, {"reached", goal.name}});
    else
        std::cout << goal.subject << " is " << goal.name << '\n';
}

void awaitFound(const Options& options, const std::string& address) {
    BusFeed feed(BusFeed::Signals::All);
    const auto adapter = openAdapter(options);
    bool isFound = false;
    const std::string path = adapter->getPath();
    const auto isConcerned = [&](const BusSignal& signal) {
        if (isChange(signal, path, "Powered") && signal.arguments == Json{"Powered", false})
            throw adapterLost(*adapter);
        isFound = isFound || (signal.path == path && signal.member == "DeviceFound" &&
                              begins(signal.arguments, address));
        return isFound;
    };
    ask(options, "cannot start a discovery on " + adapterName(*adapter), *adapter,
        "StartDiscovery"); // it ends with this process
    await(options, feed, *adapter, {"found", address, [&isFound] { return isFound; }, isConcerned});
}

void awaitDevice(const Options& options, const std::string& address, const char* name,
                 const char* property) {
    BusFeed feed(BusFeed::Signals::All);
    const auto adapter = openAdapter(options);
    const auto isSo = [&] {
        const Json properties = readIfKnown(*adapter, address);
        return properties.is_object() && properties.value(property, false);
    };
    const std::string path = devicePath(*adapter, address); // it need not be known yet
    const auto isConcerned = [&](const BusSignal& signal) {
        return isChange(signal, path, property) ||
               (signal.member == "DeviceCreated" && begins(signal.arguments, path));
    };
    await(options, feed, *adapter, {name, address, isSo, isConcerned});
}

void awaitPower(const Options& options) {
    BusFeed feed(BusFeed::Signals::All);
    const auto adapter = openAdapter(options);
    const auto isOn = [&] { return readProperties(*adapter).value("Powered", false); };
    const auto isConcerned = [&](const BusSignal& signal) {
        return isChange(signal, adapter->getPath(), "Powered");
    };
    await(options, feed, *adapter, {"powered", adapterName(*adapter), isOn, isConcerned});
}

void awaitConnected(const Options& options, const std::string& address) {
    awaitDevice(options, address, "connected", "Connected");
}

void awaitPaired(const Options& options, const std::string& address) {
    awaitDevice(options, address, "paired", "Paired");
}

} // namespace

const Verb waitVerb = {
    "wait",
    "General",
    "Wait until something is so; the exit status tells",
    "kesbt wait found 00:11:22:33:44:55\n"
    "kesbt --timeout 60 wait connected 00:11:22:33:44:55\n"
    "kesbt wait paired 00:11:22:33:44:55 && echo paired\n"
    "kesbt --adapter hci1 wait powered",
    {{"found", "Until a device is within reach (with a discovery)", Limit::OnlyGiven,
      oneDevice(awaitFound)},
     {"connected", "Until a device is connected", Limit::OnlyGiven,
      oneDevice(awaitConnected, knownDevices)},
     {"paired", "Until a device is paired", Limit::OnlyGiven, oneDevice(awaitPaired, knownDevices)},
     {"powered", "Until the adapter is on", Limit::OnlyGiven, noArguments(awaitPower)}}};

} // namespace Kesbt
