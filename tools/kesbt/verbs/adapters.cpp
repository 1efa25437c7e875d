// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "show/table.h"
#include "verbs/list.h"

#include <bluetooth/adapter_list.h>

namespace Kesbt {

namespace {

Json readAdapters(Bluetooth::Manager& manager) {
    const std::unique_ptr<Bluetooth::AdapterList> adapters(manager.listAdapters());
    if (!adapters)
        throw refusal("cannot list the adapters", manager);
    const std::string preferred = adapters->empty() ? "" : defaultAdapterPath(manager);
    Json list = Json::array();
    for (Bluetooth::Adapter* adapter : *adapters) {
        if (!adapter)
            throw daemonLost();
        list.push_back(
            describe(*adapter, adapter->getPath() == preferred, readProperties(*adapter)));
    }
    return list;
}

void listAdapters(const Options& options) {
    const Json adapters = readAdapters(*openManager());
    if (options.json) {
        printDocument(adapters);
        return;
    }
    Table table({"ADAPTER", "ADDRESS", "POWERED", "DISCOVERABLE", "DEFAULT", "NAME"});
    for (const Json& adapter : adapters) {
        const Json& properties = adapter["properties"];
        table.add({{display(adapter["adapter"]), Colour::Bold},
                   field(properties, "Address"),
                   yesNo(field(properties, "Powered")),
                   yesNo(field(properties, "Discoverable")),
                   display(adapter["default"]),
                   field(properties, "Name")});
    }
    table.print();
}

} // namespace

const Verb adaptersVerb = {"adapters",
                           "Adapters",
                           "List the adapters",
                           "kesbt adapters\nkesbt adapters --json",
                           {{Limit::Whole, noArguments(listAdapters)}}};

} // namespace Kesbt
