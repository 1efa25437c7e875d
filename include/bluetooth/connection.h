// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CONNECTION_H
#define KESBLUETOOTH_CONNECTION_H

#include <bluetooth/export.h>

#include <dbus/dbus.h>

namespace Bluetooth {

/// The process's connection to a bus: libdbus's shared one, the same for every proxy.
///
/// The process does not end when the bus goes away (libdbus's exit-on-disconnect is turned off);
/// calls then fail, and a later get() connects anew.
///
/// A program may use this connection itself:
/// - dbus_connection_send_with_reply_and_block() loses nothing, but a slow call delays every call
///   of the library meanwhile;
/// - where the program dispatches the connection (a GLib main loop,
///   dbus_connection_read_write_dispatch()), its handlers may call methods; calls of other threads
///   on that bus may wait until a handler returns, so a handler must not wait for such a thread;
/// - its dispatch status function must not call the library.
class KESBLUETOOTH_API Connection {
public:
    Connection() = delete;

    /// Returns the connection, and opens it when the process has none to that bus.
    /// @param type DBUS_BUS_SYSTEM or DBUS_BUS_SESSION
    /// @return the shared connection with one more reference, or null when the bus cannot be
    ///         reached (logged)
    ///
    /// Blocks while connecting. May be called from any thread.
    static DBusConnection* get(DBusBusType type);

    /// Drops one reference. @param connection may be null
    static void unref(DBusConnection* connection);
};

} // namespace Bluetooth

#endif
