// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/creation.h"
#include "daemon/objects.h"
#include "show/service_record.h"
#include "show/table.h"
#include "show/uuid.h"
#include "verbs/list.h"

#include <cstdlib>

namespace Kesbt {

namespace {

Bluetooth::Dict discover(const Options& options, Bluetooth::Device& device,
                         const std::string& address, const std::string& pattern) {
    Watchdog::Task task;
    task.name = "reading the services of " + address;
    task.cancel = [path = std::string(device.getPath())] {
        Bluetooth::Device(path.c_str()).cancelDiscovery();
    };
    printHint("Asking " + address + " for its services (Ctrl-C stops it)");
    std::unique_ptr<Bluetooth::Dict> records;
    {
        const Watchdog watchdog(options.limit, std::move(task));
        records.reset(device.discoverServices(pattern.c_str()));
        if (!records)
            watchdog.throwIfCancelled();
    }
    if (!records)
        throw refusal("cannot read the services of " + address, device);
    return *records;
}

Json toJson(const Bluetooth::DictEntry& entry) {
    const std::string xml = display(Kesbt::toJson(entry.second));
    const ServiceRecord record = parseServiceRecord(xml);
    return {{"handle", std::strtoul(entry.first.c_str(), nullptr, 10)},
            {"name", record.name},
            {"uuids", record.uuids},
            {"xml", xml}};
}

void listServices(const Options& options, const std::string& address, const std::string& pattern) {
    const auto device = openDevice(options, address);
    Json list = Json::array();
    for (const auto& entry : discover(options, *device, address, pattern))
        list.push_back(toJson(entry));
    if (options.json) {
        printDocument(list);
        return;
    }
    Table table({"HANDLE", "CLASS", "MEANING", "NAME"});
    for (const Json& record : list) {
        const std::string uuid = record["uuids"].empty() ? "" : display(record["uuids"][0]);
        table.add({display(record["handle"]), uuid, uuidName(uuid), display(record["name"])});
    }
    table.print();
}

Action build(const Syntax& syntax) {
    const auto address = addAddress(syntax, knownDevices);
    auto pattern = std::make_shared<std::string>();
    syntax.app
        .add_option("PATTERN", *pattern,
                    "Which services: a UUID such as 0x110b, or a name such as spp")
        ->type_name("");
    return [&options = syntax.options, address, pattern] {
        listServices(options, *address, *pattern);
    };
}

} // namespace

const Verb servicesVerb = {"services",
                           "Devices",
                           "Read a known device's service records",
                           "kesbt services 00:11:22:33:44:55\n"
                           "kesbt services 00:11:22:33:44:55 0x110b --json",
                           {{Limit::Task, build}}};

} // namespace Kesbt
