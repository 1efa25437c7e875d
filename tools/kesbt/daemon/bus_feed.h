// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_BUS_FEED_H
#define KESBT_DAEMON_BUS_FEED_H

#include "show/output.h"

#include <dbus/dbus.h>

#include <memory>
#include <string>
#include <vector>

namespace Kesbt {

/// One signal with all that it carries.
struct BusSignal {
    std::string path;
    std::string interface;
    std::string member;
    Json arguments; ///< an array
};

/// Signals of the system bus by match rules, on a connection of its own. The library's callbacks
/// tell which proxy subscribed; this tells which object sent, also objects that came later, and
/// when the daemon leaves. Only the daemon and the bus are believed: any program of the machine can
/// send signals, straight to this connection too.
class BusFeed {
public:
    /// With signals of the daemon, or only with those that tell when it comes and goes. A Failure
    /// when the bus cannot be reached.
    enum class Signals { All, Presence };
    explicit BusFeed(Signals wanted);

    /// For waitForInput(), once next() has returned false.
    int fd() const;
    /// @return false when no signal is there. A Failure when the bus has gone.
    bool next(BusSignal& signal);

    /// Whether the signal tells that bluetoothd came or went.
    static bool isDaemonChange(const BusSignal& signal);
    static bool isDaemonGone(const BusSignal& signal);

private:
    struct Close {
        void operator()(DBusConnection* connection) const;
    };
    void watch(const char* rule);
    bool take(DBusMessage* message, BusSignal& signal);

    std::unique_ptr<DBusConnection, Close> m_connection;
    std::string m_daemon; ///< its unique name; "" while it is not there
};

} // namespace Kesbt

#endif
