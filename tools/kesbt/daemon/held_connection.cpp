// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/held_connection.h"

#include "show/text.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

void HeldConnection::print(const Options& options, const char* event) const {
    if (options.json)
        printEvent(
            {{"event", event}, {"time", timeForPrograms()}, {"address", address}, {member, name}});
}

void HeldConnection::hold(const Options& options, BusFeed& feed,
                          const Bluetooth::Device& device) const {
    Interrupt interrupt;
    print(options, "connected");
    if (!options.json) {
        std::cout << printable(name) << '\n';
        flushOutput();
        printHint("Connected with " + address + " (Ctrl-C ends it)");
    }
    while (!interrupt.came()) {
        for (BusSignal signal; feed.next(signal);) {
            if (BusFeed::isDaemonGone(signal))
                throw daemonLost();
            if (signal.path == device.getPath() && signal.member == "PropertyChanged" &&
                (signal.interface == interface || signal.interface == device.getInterface()) &&
                signal.arguments == Json{"Connected", false})
                throw Failure(address + " has ended the connection; make sure that it is within "
                                        "reach and repeat the command");
        }
        waitForInput({feed.fd(), interrupt.fd()});
    }
}

void HeldConnection::printEnd(const Options& options) const {
    print(options, "disconnected");
}

} // namespace Kesbt
