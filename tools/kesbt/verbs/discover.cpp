// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"
#include "daemon/objects.h"
#include "daemon/signal_delivery.h"
#include "show/device_watch.h"
#include "verbs/list.h"
#include "wait/waiting.h"

namespace Kesbt {

namespace {

/// What a callback was told.
struct Event {
    enum class Kind { Found, Disappeared, Powered, Removed };
    Kind kind;
    std::string subject; // a device's address, or an adapter's path
    Json value;
};

EventQueue<Event>& events() {
    static EventQueue<Event> queue;
    return queue;
}

void subscribe(Bluetooth::Manager& manager, Bluetooth::Adapter& adapter) {
    using Bluetooth::RemoteObject;
    const bool subscribed =
        adapter.setDeviceFoundHandler(
            [](RemoteObject*, const char* address, const Bluetooth::Dict* properties) {
                events().push({Event::Kind::Found, address, toJson(*properties)});
            }) == 0 &&
        adapter.setDeviceDisappearedHandler([](RemoteObject*, const char* address) {
            events().push({Event::Kind::Disappeared, address, {}});
        }) == 0 &&
        adapter.setPropertyChangedHandler(
            [](RemoteObject*, const char* name, const Bluetooth::Variant* value) {
                if (std::string(name) == "Powered")
                    events().push({Event::Kind::Powered, "", toJson(*value)});
            }) == 0 &&
        manager.setAdapterRemovedHandler([](RemoteObject*, const Bluetooth::ObjectPath* path) {
            events().push({Event::Kind::Removed, path->str(), {}});
        }) == 0;
    if (!subscribed)
        throw refusal("cannot watch " + adapterName(adapter), adapter);
}

/// Prints until the user interrupts or the deadline comes. A Failure when the discovery ends.
void watch(const Options& options, Bluetooth::Adapter& adapter, BusFeed& daemon,
           Interrupt& interrupt, Clock::time_point deadline) {
    DeviceWatch devices(options.json);
    while (!interrupt.came() && Clock::now() < deadline) {
        while (const auto event = events().pop()) {
            if (event->kind == Event::Kind::Found)
                devices.found(event->subject, event->value);
            else if (event->kind == Event::Kind::Disappeared)
                devices.vanished(event->subject);
            else if (event->kind == Event::Kind::Removed && event->subject == adapter.getPath())
                throw adapterRemoved(adapterName(adapter));
            else if (event->kind == Event::Kind::Powered && event->value == false)
                throw adapterLost(adapter);
        }
        for (BusSignal signal; daemon.next(signal);) {
            if (BusFeed::isDaemonGone(signal))
                throw daemonLost();
        }
        waitForInput({events().fd(), daemon.fd(), interrupt.fd()}, deadline);
    }
}

void discover(const Options& options, double seconds) {
    Interrupt interrupt; // before the receive thread starts
    const auto manager = openManager();
    const auto adapter = openAdapter(*manager, options);
    const std::string name = adapterName(*adapter);
    BusFeed daemon(BusFeed::Signals::Presence);
    subscribe(*manager, *adapter);
    const SignalDelivery delivery(*adapter);

    ask(options, "cannot start a discovery on " + name, *adapter, "StartDiscovery");
    const auto isDiscovering = [&] {
        return interrupt.came() || readProperties(*adapter).value("Discovering", false);
    };
    if (!waitUntil(isDiscovering, options.limit.step()))
        throw notConfirmed(name + " does not discover");

    const auto deadline =
        seconds > 0 ? Clock::now() + std::chrono::milliseconds(static_cast<long>(seconds * 1000))
                    : Clock::time_point::max();
    printHint("Searching on " + name + " (Ctrl-C ends it)");
    watch(options, *adapter, daemon, interrupt, deadline);
    ask(options, "cannot stop the discovery on " + name, *adapter, "StopDiscovery");
}

Action build(const Syntax& syntax) {
    const auto seconds =
        addSeconds(syntax, "--seconds", "End after this time (default: on Ctrl-C)");
    return [&options = syntax.options, seconds] { discover(options, *seconds); };
}

} // namespace

const Verb discoverVerb = {
    "discover",
    "Devices",
    "Show devices within reach as they appear, change and vanish",
    "kesbt discover\nkesbt discover --seconds 10 --json\nkesbt --adapter hci1 discover",
    {{Limit::Stream, build}}};

} // namespace Kesbt
