// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_HELD_CONNECTION_H
#define KESBT_DAEMON_HELD_CONNECTION_H

#include "daemon/bus_feed.h"
#include "daemon/objects.h"

namespace Kesbt {

/// A connection that the daemon ends when the program leaves that made it: a serial port, a
/// network.
struct HeldConnection {
    std::string address;
    const char* member;    ///< what a program gets `name` as, e.g. "terminal"
    std::string name;      ///< e.g. "/dev/rfcomm0"
    std::string interface; ///< whose "Connected" tells that it is lost

    /// Tells that it is there, and holds it until the user interrupts. A Failure when it is lost.
    /// @param feed has been there since before the connection
    void hold(const Options& options, BusFeed& feed, const Bluetooth::Device& device) const;
    /// Tells that it has been ended.
    void printEnd(const Options& options) const;

private:
    void print(const Options& options, const char* event) const;
};

/// Reads the name of what was just connected. A Failure when the reply has none.
std::string connectedName(Bluetooth::RemoteObject& proxy, const std::string& address);

} // namespace Kesbt

#endif
