#include "command/answer_limit.h"
#include "command/verb.h"
#include "daemon/bus_feed.h"
#include "daemon/objects.h"
#include "show/text.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

namespace {

/// What is waited for. A state is looked at first and after each signal of the daemon.
struct Goal {
    const char* name;    ///< e.g. "paired"
    std::string subject; ///< an address or an adapter
    std::function<bool()> isReached;
    std::function<void(const BusSignal&)> observe = [](const BusSignal&) {};
};

bool isRemoval(const BusSignal& signal, const Bluetooth::Adapter& adapter) {
    return signal.member == "AdapterRemoved" && !signal.arguments.empty() &&
           signal.arguments[0] == adapter.getPath();
}

void await(const Options& options, BusFeed& feed, const Bluetooth::Adapter& adapter,
           const Goal& goal) {
    Interrupt interrupt;
    const auto deadline =
        options.limited ? Clock::now() + options.timeLimit() : Clock::time_point::max();
    bool isTold = false;
    while (!goal.isReached()) {
        if (!isTold)
            printHint("Waiting until " + goal.subject + " is " + goal.name + " (Ctrl-C ends it)");
        isTold = true;
        if (interrupt.came())
            throw Failure("interrupted before " + goal.subject + " was " + goal.name +
                          "; repeat the command to go on waiting");
        if (Clock::now() >= deadline)
            throw notConfirmed(goal.subject + " was not " + goal.name);
        waitForInput({feed.fd(), interrupt.fd()}, deadline);
        for (BusSignal signal; feed.next(signal);) {
            if (BusFeed::isDaemonGone(signal))
                throw daemonLost();
            if (isRemoval(signal, adapter))
                throw adapterRemoved(adapterName(adapter));
            goal.observe(signal);
        }
    }
    if (options.json)
        printDocument({{"subject", goal.subject}, {"reached", goal.name}});
    else
        std::cout << goal.subject << " is " << goal.name << '\n';
}

BusFeed openFeed() {
    return BusFeed({"type='signal',sender='org.bluez'", BusFeed::daemonRule});
}

void awaitFound(const Options& options, const std::string& address) {
    BusFeed feed = openFeed();
    const auto adapter = openAdapter(options);
    bool isFound = false;
    Goal goal = {"found", address, [&isFound] { return isFound; }};
    goal.observe = [&](const BusSignal& signal) {
        if (signal.path != adapter->getPath())
            return;
        if (signal.member == "PropertyChanged" && signal.arguments == Json{"Powered", false})
            throw adapterOff(adapterName(*adapter));
        isFound = isFound || (signal.member == "DeviceFound" && !signal.arguments.empty() &&
                              signal.arguments[0] == address);
    };
    ask(options, "cannot start a discovery on " + adapterName(*adapter), *adapter,
        "StartDiscovery"); // it ends with this process
    await(options, feed, *adapter, goal);
}

void awaitDevice(const Options& options, const std::string& address, const char* name,
                 const char* property) {
    BusFeed feed = openFeed();
    const auto adapter = openAdapter(options);
    const auto isSo = [&] {
        const AnswerLimit limit;
        // It may become known only later.
        const std::unique_ptr<Bluetooth::Device> device(
            adapter->findDevice(address.c_str(), false));
        return device && readProperties(*device).value(property, false);
    };
    await(options, feed, *adapter, {name, address, isSo});
}

void awaitPower(const Options& options) {
    BusFeed feed = openFeed();
    const auto adapter = openAdapter(options);
    const auto isOn = [&] { return readProperties(*adapter).value("Powered", false); };
    await(options, feed, *adapter, {"powered", adapterName(*adapter), isOn});
}

void build(CLI::App& command, const Options& options) {
    command.require_subcommand(1);
    const auto add = [&](const char* name, const char* description, const auto& action) {
        CLI::App* verb = command.add_subcommand(name, description);
        const auto address = addAddress(*verb);
        verb->callback([address, action] { action(*address); });
    };
    add("found", "Until a device is within reach (with a discovery)",
        [&options](const std::string& address) { awaitFound(options, address); });
    add("connected", "Until a device is connected", [&options](const std::string& address) {
        awaitDevice(options, address, "connected", "Connected");
    });
    add("paired", "Until a device is paired", [&options](const std::string& address) {
        awaitDevice(options, address, "paired", "Paired");
    });
    command.add_subcommand("powered", "Until the adapter is on")->callback([&options] {
        awaitPower(options);
    });
}

} // namespace

extern const Verb waitVerb;
const Verb waitVerb = {"wait", "General", "Wait until something is so; the exit status tells",
                       "kesbt wait found 00:11:22:33:44:55\n"
                       "kesbt --timeout 60 wait connected 00:11:22:33:44:55\n"
                       "kesbt wait paired 00:11:22:33:44:55 && echo paired\n"
                       "kesbt --adapter hci1 wait powered",
                       build};

} // namespace Kesbt
