#include "base/bluez.h"
#include "base/table.h"
#include "base/verb.h"

#include <bluetooth/device_list.h>

namespace Kesbt {

namespace {

void listDevices(const Options& options) {
    const auto adapter = openAdapter(options);
    const std::unique_ptr<Bluetooth::DeviceList> devices(adapter->listDevices());
    if (!devices)
        throw refusal("cannot list the devices of " + adapterName(*adapter), *adapter);
    Json list = Json::array();
    for (Bluetooth::Device* device : *devices) {
        if (!device)
            throw daemonLost();
        list.push_back(describe(*device, readProperties(*device)));
    }
    if (options.json) {
        printDocument(list);
        return;
    }
    Table table({"ADDRESS", "PAIRED", "TRUSTED", "CONNECTED", "KIND", "NAME"});
    for (const Json& device : list) {
        const Json& properties = device["properties"];
        table.add({{display(device["address"]), Colour::Bold},
                   yesNo(field(properties, "Paired")),
                   yesNo(field(properties, "Trusted")),
                   yesNo(field(properties, "Connected")),
                   field(properties, "Icon"),
                   field(properties, "Alias")});
    }
    table.print();
}

void build(CLI::App& command, const Options& options) {
    command.callback([&options] { listDevices(options); });
}

} // namespace

extern const Verb devicesVerb;
const Verb devicesVerb = {"devices", "Devices", "List the devices that an adapter knows",
                          "kesbt devices\nkesbt --adapter hci1 devices --json", build};

} // namespace Kesbt
