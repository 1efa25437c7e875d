// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/creation.h"
#include "daemon/objects.h"
#include "show/output.h"
#include "verbs/list.h"

namespace Kesbt {

namespace {

void createDevice(const Options& options, const std::string& address) {
    const auto adapter = openAdapter(options);
    printHint("Connecting to " + address + " on " + adapterName(*adapter) + " (Ctrl-C stops it)");
    std::unique_ptr<Bluetooth::Device> device;
    {
        const Watchdog watchdog(options.limit, creationTask(*adapter, address, "creating"));
        device.reset(adapter->createDevice(address.c_str()));
        if (!device)
            watchdog.throwIfCancelled();
    }
    if (!device)
        throw refusal("cannot create " + address + " on " + adapterName(*adapter), *adapter);
    printDevice(options, *device);
}

} // namespace

const Verb createVerb = {"create",
                         "Devices",
                         "Connect to a device and make it known, without pairing",
                         "kesbt create 00:11:22:33:44:55",
                         {{Limit::Task, oneDevice(createDevice)}}};

} // namespace Kesbt
