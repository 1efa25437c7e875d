// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/failure.h"
#include "show/output.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <bluetooth/bluez_object.h>
#include <bluetooth/commandlib.h>

#include <glob.h>
#include <unistd.h>

#include <iostream>

namespace Kesbt {

namespace {

bool isAdapterMarked() {
    glob_t found{};
    const bool isMarked = glob("/tmp/bluetooth.info_*", 0, nullptr, &found) == 0;
    globfree(&found);
    return isMarked;
}

void restartDaemon(const Options& options) {
    if (geteuid() != 0)
        throw Failure("only root may restart bluetoothd; run it as root");
    printHint("Restarting bluetoothd");
    if (Bluetooth::restartBluetoothd() != 0)
        throw Failure(isAdapterMarked()
                          ? "bluetoothd does not run after its restart; start /usr/sbin/bluetoothd "
                            "by hand and read what it says"
                          : "bluetoothd was not restarted: no adapter is plugged in (there is no "
                            "/tmp/bluetooth.info_* file); plug one in");
    // That its process runs is not enough: it may fail to come to the bus.
    if (!waitUntil(Bluetooth::BluezObject::hasBluetoothd, options.limit.step()))
        throw notConfirmed("bluetoothd was started and did not come to the system bus");
    if (options.json)
        printDocument({{"restarted", true}});
    else
        std::cout << "Restarted bluetoothd\n";
}

} // namespace

const Verb restartDaemonVerb = {"restart-daemon",
                                "Host",
                                "Kill bluetoothd and start it again",
                                "kesbt restart-daemon",
                                {{Limit::Steps, noArguments(restartDaemon)}}};

} // namespace Kesbt
