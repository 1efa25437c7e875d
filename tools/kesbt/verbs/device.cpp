#include "command/answer_limit.h"
#include "command/verb.h"
#include "daemon/objects.h"

namespace Kesbt {

namespace {

void build(CLI::App& command, const Options& options) {
    const auto address = addAddress(command);
    command.callback([&options, address] {
        const AnswerLimit limit;
        const auto device = openDevice(options, *address);
        printDevice(options, *device);
    });
}

} // namespace

extern const Verb deviceVerb;
const Verb deviceVerb = {"device", "Devices", "Show a known device's properties",
                         "kesbt device 00:11:22:33:44:55\n"
                         "kesbt device 00:11:22:33:44:55 --json",
                         build};

} // namespace Kesbt
