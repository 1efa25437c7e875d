#include "command/answer_limit.h"
#include "command/verb.h"
#include "daemon/objects.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

namespace {

void removeDevice(const Options& options, const std::string& address) {
    const auto adapter = openAdapter(options);
    const auto device = openDevice(*adapter, address);
    ask(options, "cannot remove " + address, *adapter, "RemoveDevice",
        Bluetooth::ObjectPath(device->getPath()));

    const auto isGone = [&] {
        const AnswerLimit limit;
        const std::unique_ptr<Bluetooth::Device> found(adapter->findDevice(address.c_str(), false));
        return !found && adapter->getErrorMessage() == "Does Not Exist";
    };
    if (!waitUntil(isGone, options.timeLimit()))
        throw notConfirmed(address + " is still known to " + adapterName(*adapter));
    if (options.json)
        printDocument({{"address", address},
                       {"adapter", adapterName(*adapter)},
                       {"path", device->getPath()},
                       {"removed", true}});
    else
        std::cout << "Removed " << address << " from " << adapterName(*adapter) << '\n';
}

void build(CLI::App& command, const Options& options) {
    const auto address = addAddress(command);
    command.callback([&options, address] { removeDevice(options, *address); });
}

} // namespace

extern const Verb removeVerb;
const Verb removeVerb = {"remove", "Devices", "Forget a device and its pairing",
                         "kesbt remove 00:11:22:33:44:55", build};

} // namespace Kesbt
