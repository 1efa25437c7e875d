#include "command/answer_limit.h"
#include "command/verb.h"
#include "daemon/objects.h"

#include <bluetooth/device_list.h>

namespace Kesbt {

namespace {

void listDevices(const Options& options) {
    const AnswerLimit limit;
    const auto adapter = openAdapter(options);
    const std::unique_ptr<Bluetooth::DeviceList> devices(adapter->listDevices());
    if (!devices)
        throw refusal("cannot list the devices of " + adapterName(*adapter), *adapter);
    printDevices(options, *devices);
}

void build(CLI::App& command, const Options& options) {
    command.callback([&options] { listDevices(options); });
}

} // namespace

extern const Verb devicesVerb;
const Verb devicesVerb = {"devices", "Devices", "List the devices that an adapter knows",
                          "kesbt devices\nkesbt --adapter hci1 devices --json", build};

} // namespace Kesbt
