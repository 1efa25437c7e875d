// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "daemon/scan_service.h"
#include "show/device_watch.h"
#include "show/table.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

namespace {

using Bluetooth::Scanner;

void list(const Options& options) {
    const std::string adapter = adapterName(*openAdapter(options));
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

void watch(const Options& options) {
    constexpr std::chrono::seconds interval{1};
    // A service that was started anew needs a round of discovery to find everything again.
    constexpr std::chrono::seconds rediscovery{12};
    Interrupt interrupt;
    const std::string adapter = adapterName(*openAdapter(options));
    std::string owner = scanServiceOwner();
    printHint("Watching the shared scan on " + adapter + " (Ctrl-C ends it)");
    Scanner scanner;
    DeviceWatch watch(options.json);
    Clock::time_point complete = Clock::now();
    while (!interrupt.came()) {
        const auto next = Clock::now() + interval;
        const auto devices = readFound(scanner, adapter);
        const std::string ownerNow = scanServiceOwner();
        if (ownerNow != owner && !watch.devices().empty())
            complete = Clock::now() + rediscovery;
        owner = ownerNow;
        for (const auto& [address, properties] : devices)
            watch.found(address, properties);
        const auto known = watch.devices();
        for (const auto& device : known) {
            if (devices.count(device.first) == 0 && Clock::now() >= complete)
                watch.vanished(device.first);
        }
        waitForInput({interrupt.fd()}, next);
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
