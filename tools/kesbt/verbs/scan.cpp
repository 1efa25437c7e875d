// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"
#include "daemon/objects.h"
#include "daemon/scan_service.h"
#include "show/device_watch.h"
#include "show/table.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <iostream>
#include <optional>

namespace Kesbt {

namespace {

using Bluetooth::Scanner;

/// The name of the adapter. One that is off finds nothing, which is not the same as nothing there.
std::string openPoweredAdapter(const Options& options) {
    const auto adapter = openAdapter(options);
    if (!readProperties(*adapter).value("Powered", false))
        throw adapterOff(adapterName(*adapter));
    return adapterName(*adapter);
}

void list(const Options& options) {
    const std::string adapter = openPoweredAdapter(options);
    scanServiceOwner();
    Scanner scanner;
    const auto devices = readFound(scanner, adapter);
    if (options.json) {
        Json document = Json::array();
        for (const auto& [address, properties] : devices)
            document.push_back(
                {{"address", address}, {"adapter", adapter}, {"properties", properties}});
        printDocument(document);
        return;
    }
    if (devices.empty())
        printHint("The scan has found no new device yet; ask again in a few seconds");
    Table table({"ADDRESS", "RSSI", "CLASS", "NAME"});
    for (const auto& [address, properties] : devices)
        table.add({{address, Colour::Bold},
                   field(properties, "RSSI"),
                   field(properties, "Class"),
                   field(properties, "Alias")});
    table.print();
}

/// The shared scan of one adapter, over restarts of bluetoothd.
class LastingScan {
public:
    LastingScan(const Options& options, const std::string& adapter) : m_options(options) {
        m_options.adapter = adapter; // another one may be the default one later
    }

    /// What is found. Nothing while bluetoothd is away or brings its adapters up, which is told
    /// once; a Failure when it cannot go on otherwise.
    std::optional<std::map<std::string, Json>> read() {
        try {
            openPoweredAdapter(m_options);
            auto devices = readFound(m_scanner, m_options.adapter);
            if (m_isAway)
                std::cerr << "bluetoothd is back, the scan on " << m_options.adapter
                          << " goes on\n";
            m_isAway = false;
            takeSignals();
            m_ready = {}; // a restart that has been is over
            return devices;
        } catch (const Failure&) {
            if (!isRestarting())
                throw;
        }
        if (!m_isAway)
            std::cerr << "bluetoothd has left the system bus; waiting for it (Ctrl-C ends it)\n";
        m_isAway = true;
        return std::nullopt;
    }

private:
    void takeSignals() {
        for (BusSignal signal; m_daemon.next(signal);)
            m_ready = Clock::now() + m_options.limit.step();
    }

    bool isRestarting() {
        takeSignals();
        return Clock::now() < m_ready || !Bluetooth::BluezObject::hasBluetoothd();
    }

    Options m_options;
    BusFeed m_daemon{BusFeed::Signals::Presence};
    Scanner m_scanner;
    Clock::time_point m_ready; ///< when a daemon that has come must have the adapter
    bool m_isAway = false;
};

void watch(const Options& options) {
    constexpr std::chrono::seconds interval{1};
    // A service or daemon that was started anew needs a round of discovery to find everything
    // again.
    constexpr std::chrono::seconds rediscovery{12};
    Interrupt interrupt;
    const std::string adapter = openPoweredAdapter(options);
    std::string owner = scanServiceOwner();
    printHint("Watching the shared scan on " + adapter + " (Ctrl-C ends it)");
    LastingScan scan(options, adapter);
    DeviceWatch watch(options.json);
    Clock::time_point complete = Clock::now();
    for (; !interrupt.came(); waitForInput({interrupt.fd()}, Clock::now() + interval)) {
        const auto devices = scan.read();
        const std::string ownerNow = scanServiceOwner();
        if (!devices || (ownerNow != owner && !watch.devices().empty()))
            complete = Clock::now() + rediscovery;
        owner = ownerNow;
        if (!devices)
            continue;
        for (const auto& [address, properties] : *devices)
            watch.found(address, properties);
        const auto known = watch.devices();
        for (const auto& device : known) {
            if (devices->count(device.first) == 0 && Clock::now() >= complete)
                watch.vanished(device.first);
        }
    }
}

void stop(const Options& options) {
    const std::string adapter = adapterName(*openAdapter(options));
    const bool isRunning = !scanServiceOwner().empty();
    Scanner scanner;
    if (isRunning) // asking would start it
        ask(options, "cannot stop the scan on " + adapter, scanner, "RemoveFinder",
            adapter.c_str());
    if (options.json)
        printDocument({{"adapter", adapter}, {"stopped", isRunning}});
    else
        std::cout << (isRunning ? "Stopped the scan on " : "No scan is running on ") << adapter
                  << '\n';
}

} // namespace

const Verb scanVerb = {
    "scan",
    "Devices",
    "Find devices with a scan that programs share",
    "kesbt scan list\nkesbt scan watch --json\n"
    "kesbt --adapter hci1 scan stop",
    {{"list", "Show the devices found so far; the first time starts the scan", Limit::Steps,
      noArguments(list)},
     {"watch", "Ask each second and show what came, changed and went", Limit::Stream,
      noArguments(watch)},
     {"stop", "End the scan, for all programs that share it", Limit::Steps, noArguments(stop)}}};

} // namespace Kesbt
