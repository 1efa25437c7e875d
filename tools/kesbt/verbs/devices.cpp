// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"

#include <bluetooth/device_list.h>

namespace Kesbt {

namespace {

void listDevices(const Options& options) {
    const auto adapter = openAdapter(options);
    const std::unique_ptr<Bluetooth::DeviceList> devices(adapter->listDevices());
    if (!devices)
        throw refusal("cannot list the devices of " + adapterName(*adapter), *adapter);
    printDevices(options, *devices);
}

} // namespace

const Verb devicesVerb = {"devices",
                          "Devices",
                          "List the devices that an adapter knows",
                          "kesbt devices\nkesbt --adapter hci1 devices --json",
                          {{Limit::Whole, noArguments(listDevices)}}};

} // namespace Kesbt
