// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"

#include <iostream>

namespace Kesbt {

namespace {

void cancel(const Options& options, const std::string& address) {
    const auto adapter = openAdapter(options);
    const std::string name = adapterName(*adapter);
    try {
        ask(options, "cannot cancel the creation of " + address, *adapter, "CancelDeviceCreation",
            address.c_str());
    } catch (const Failure&) {
        if (failedWith(*adapter, "DoesNotExist"))
            throw Failure("no creation of " + address + " is under way on " + name +
                          "; see what happens with: kesbt monitor");
        throw;
    }
    if (options.json)
        printDocument({{"address", address}, {"adapter", name}, {"cancelled", true}});
    else
        std::cout << "Cancelled the creation of " << address << " on " << name << '\n';
}

} // namespace

const Verb cancelVerb = {"cancel",
                         "Pairing",
                         "Stop a creation; only for the program that began it",
                         "kesbt cancel 00:11:22:33:44:55",
                         {{Limit::Steps, oneDevice(cancel)}}};

} // namespace Kesbt
