#include "command/verb.h"
#include "daemon/creation.h"
#include "daemon/objects.h"

namespace Kesbt {

namespace {

void createDevice(const Options& options, const std::string& address) {
    const auto adapter = openAdapter(options);
    Watchdog::Task task = creationTask(*adapter, address, "creating");
    task.limit = watchedLimit(options);
    std::unique_ptr<Bluetooth::Device> device;
    {
        const Watchdog watchdog(std::move(task));
        device.reset(adapter->createDevice(address.c_str()));
        if (!device)
            watchdog.throwIfCancelled();
    }
    if (!device)
        throw refusal("cannot create " + address + " on " + adapterName(*adapter), *adapter);
    printDevice(options, *device);
}

void build(CLI::App& command, const Options& options) {
    const auto address = addAddress(command);
    command.callback([&options, address] { createDevice(options, *address); });
}

} // namespace

extern const Verb createVerb;
const Verb createVerb = {"create", "Devices",
                         "Connect to a device and make it known, without pairing",
                         "kesbt create 00:11:22:33:44:55", build};

} // namespace Kesbt
