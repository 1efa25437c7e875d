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
/// when the daemon leaves.
class BusFeed {
public:
    static const char* const daemonRule; ///< tells when bluetoothd comes and goes

    /// A Failure when the bus cannot be reached.
    explicit BusFeed(const std::vector<std::string>& rules);

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
    std::unique_ptr<DBusConnection, Close> m_connection;
};

} // namespace Kesbt

#endif
