// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/held_connection.h"

#include "show/text.h"
#include "wait/waiting.h"

#include <iostream>
#include <set>
#include <string>

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
    const Json lost = {"Connected", false};
    while (!interrupt.came()) {
        // The feed may still have the end of a connection before this one, and then its beginning.
        std::set<std::string> ended;
        for (BusSignal signal; feed.next(signal);) {
            if (BusFeed::isDaemonGone(signal))
                throw daemonLost();
            if (signal.path != device.getPath() || signal.member != "PropertyChanged")
                continue;
            if (signal.arguments == lost)
                ended.insert(signal.interface);
            else if (signal.arguments == Json{"Connected", true})
                ended.erase(signal.interface);
        }
        if (ended.count(interface) + ended.count(device.getInterface()) > 0)
            throw Failure(address + " has ended the connection; make sure that it is within "
                                    "reach and repeat the command");
        waitForInput({feed.fd(), interrupt.fd()});
    }
}

void HeldConnection::printEnd(const Options& options) const {
    print(options, "disconnected");
}

std::string connectedName(Bluetooth::RemoteObject& proxy, const std::string& address) {
    std::string name;
    if (proxy.getReplyValue(name) != 0 || name.empty())
        throw Failure("bluetoothd does not name what it connected of " + address +
                      "; restart it and repeat the command");
    return name;
}

} // namespace Kesbt
