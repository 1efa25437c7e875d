// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "daemon/property_setting.h"
#include "verbs/list.h"

namespace Kesbt {

namespace {

const PropertySetting setting = {"device set",
                                 "",
                                 "  kesbt device set 00:11:22:33:44:55 Trusted true\n"
                                 "  kesbt device set 00:11:22:33:44:55 Blocked false\n"
                                 "  kesbt device set 00:11:22:33:44:55 Alias \"My headset\"",
                                 {{"Trusted", true}, {"Blocked", true}, {"Alias", false}}};

Action buildSet(const Syntax& syntax) {
    const auto address = addAddress(syntax, knownDevices);
    return [&options = syntax.options, address, given = setting.addArguments(syntax)] {
        const auto device = openDevice(options, *address);
        setting.set(options, *device, *address, *given,
                    {{"address", *address}, {"adapter", adapterName(*device)}});
    };
}

void showDevice(const Options& options, const std::string& address) {
    const auto device = openDevice(options, address);
    printDevice(options, *device);
}

} // namespace

const Verb deviceVerb = {
    "device",
    "Devices",
    "Show a known device's properties, or set one",
    "kesbt device 00:11:22:33:44:55\n"
    "kesbt device 00:11:22:33:44:55 --json\n"
    "kesbt device set 00:11:22:33:44:55 Trusted true",
    {{Limit::Whole, oneDevice(showDevice, knownDevices)},
     {"set", "Set a property and show its old and new value", Limit::Steps, buildSet}}};

} // namespace Kesbt
