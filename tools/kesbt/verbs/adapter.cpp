// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "daemon/property_setting.h"
#include "verbs/list.h"

namespace Kesbt {

namespace {

/// What the daemon lets be set.
const PropertySetting setting = {"adapter set",
                                 ", time-outs are seconds",
                                 "  kesbt adapter set Powered true\n"
                                 "  kesbt --adapter hci1 adapter set Name \"Living room\"",
                                 {{"Name", false},
                                  {"Powered", true},
                                  {"Discoverable", true},
                                  {"Pairable", true},
                                  {"DiscoverableTimeout", false},
                                  {"PairableTimeout", false}}};

void showAdapter(const Options& options) {
    const auto manager = openManager();
    const auto adapter = openAdapter(*manager, options);
    // The proxy's own properties: they have the HCI version too.
    const std::unique_ptr<Bluetooth::Dict> properties(adapter->getProperties());
    if (!properties)
        throw refusal("cannot read the properties of " + adapterName(*adapter), *adapter);
    const bool isDefault = adapter->getPath() == defaultAdapterPath(*manager);
    const Json document = describe(*adapter, isDefault, toJson(*properties));
    if (options.json) {
        printDocument(document);
        return;
    }
    Json lines = {{"Adapter", document["adapter"]},
                  {"Path", document["path"]},
                  {"Default", document["default"]}};
    lines.update(document["properties"]);
    printProperties(lines);
}

Action buildSet(const Syntax& syntax) {
    return [&options = syntax.options, given = setting.addArguments(syntax)] {
        const auto adapter = openAdapter(options);
        const std::string name = adapterName(*adapter);
        setting.set(options, *adapter, name, *given, {{"adapter", name}});
    };
}

} // namespace

const Verb adapterVerb = {
    "adapter",
    "Adapters",
    "Show an adapter's properties, or set one",
    "kesbt adapter\nkesbt --adapter hci1 adapter info --json\n"
    "kesbt adapter set Discoverable true",
    {{Limit::Whole, noArguments(showAdapter)},
     {"info", "Show all properties (also without this word)", Limit::Whole,
      noArguments(showAdapter)},
     {"set", "Set a property and show its old and new value", Limit::Steps, buildSet}}};

} // namespace Kesbt
