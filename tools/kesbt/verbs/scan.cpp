#include "command/answer_limit.h"
#include "command/verb.h"
#include "daemon/objects.h"
#include "show/device_watch.h"
#include "show/table.h"
#include "wait/waiting.h"

#include <bluetooth/scanner.h>

#include <cstdlib>
#include <iostream>
#include <map>

namespace Kesbt {

namespace {

using Bluetooth::Scanner;

constexpr char serviceName[] = "com.kestrine.bluetooth";

/// The service tells every value as text; programs get the types that other verbs give them.
Json typedValue(const std::string& name, const Json& text) {
    const std::string value = display(text);
    if (name == "RSSI" || name == "Class")
        return std::strtol(value.c_str(), nullptr, 10);
    if (name == "Paired" || name == "Trusted" || name == "LegacyPairing" || name == "Broadcaster")
        return value == "1";
    if (name != "UUIDs" || value.size() < 2)
        return value;
    Json list = Json::array();
    const std::string separator = ", ";
    for (std::string rest = value.substr(1, value.size() - 2); !rest.empty();) {
        const std::size_t end = rest.find(separator);
        list.push_back(rest.substr(0, end));
        rest = end == std::string::npos ? "" : rest.substr(end + separator.size());
    }
    return list;
}

/// Which process the service is, "" for none. It ends by itself and is started by questions.
std::string serviceOwner() {
    const AnswerLimit limit;
    Bluetooth::RemoteObject bus("org.freedesktop.DBus", "/org/freedesktop/DBus",
                                "org.freedesktop.DBus", DBUS_BUS_SESSION);
    if (!bus.getConnection())
        throw Failure("the session bus cannot be reached; log in, or try: "
                      "dbus-run-session -- kesbt scan list");
    std::string owner;
    if (bus.newMessage("GetNameOwner") == 0 && bus.append(serviceName) == 0 &&
        bus.sendMessage(true, -1) == 0)
        bus.getReplyValue(owner);
    return owner;
}

Failure scanFailure(Scanner& scanner, const std::string& adapter) {
    const std::string reason = scanner.getErrorMessage();
    if (reason.empty()) // it was the daemon that failed
        return Bluetooth::BluezObject::hasBluetoothd()
                   ? Failure("there is no adapter " + adapter + " any more; see: kesbt adapters")
                   : daemonAbsent();
    if (reason.find(serviceName) != std::string::npos)
        return Failure("the scanner service is not running; start it: kesbt-scannerd");
    return refusal("cannot ask the scanner service about " + adapter, reason);
}

/// The properties of each device, by address.
std::map<std::string, Json> readDevices(Scanner& scanner, const std::string& adapter) {
    const AnswerLimit limit;
    const std::unique_ptr<std::vector<std::pair<std::string, Bluetooth::Dict*>>> devices(
        scanner.listDevices(adapter.c_str(), false));
    if (!devices)
        throw scanFailure(scanner, adapter);
    std::map<std::string, Json> result;
    for (const auto& [address, dict] : *devices) {
        const std::unique_ptr<Bluetooth::Dict> owned(dict);
        Json properties = Json::object();
        for (const auto& [name, value] : *owned)
            properties[name] = typedValue(name, toJson(value));
        result[address] = std::move(properties);
    }
    return result;
}

void list(const Options& options) {
    const std::string adapter = adapterName(*openAdapter(options));
    serviceOwner();
    Scanner scanner;
    const auto devices = readDevices(scanner, adapter);
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
    std::string owner = serviceOwner();
    printHint("Watching the shared scan on " + adapter + " (Ctrl-C ends it)");
    Scanner scanner;
    DeviceWatch watch(options.json);
    Clock::time_point complete = Clock::now();
    while (!interrupt.came()) {
        const auto next = Clock::now() + interval;
        const auto devices = readDevices(scanner, adapter);
        const std::string ownerNow = serviceOwner();
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
    const bool isRunning = !serviceOwner().empty();
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

void build(CLI::App& command, const Options& options) {
    command.require_subcommand(1);
    command
        .add_subcommand("list", "Show the devices found so far; the first time starts\nthe scan")
        ->callback([&options] { list(options); });
    command.add_subcommand("watch", "Ask each second and show what came, changed and went")
        ->callback([&options] { watch(options); });
    command.add_subcommand("stop", "End the scan, for all programs that share it")
        ->callback([&options] { stop(options); });
}

} // namespace

extern const Verb scanVerb;
const Verb scanVerb = {"scan", "Devices", "Find devices with a scan that programs share",
                       "kesbt scan list\nkesbt scan watch --json\n"
                       "kesbt --adapter hci1 scan stop",
                       build};

} // namespace Kesbt
