// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"

namespace Kesbt {

namespace {

void showDevice(const Options& options, const std::string& address) {
    const auto device = openDevice(options, address);
    printDevice(options, *device);
}

} // namespace

const Verb deviceVerb = {"device",
                         "Devices",
                         "Show a known device's properties",
                         "kesbt device 00:11:22:33:44:55\n"
                         "kesbt device 00:11:22:33:44:55 --json",
                         {{Limit::Whole, oneDevice(showDevice, knownDevices)}}};

} // namespace Kesbt
