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
/// - its filters and object path handlers run on any thread that dispatches: besides its own, each
///   one that waits in a call of the library on that bus, and the receive thread;
/// - inside the notification of a pending call, a filter that was added before the first proxy, and
///   the dispatch status function a call of the library hangs for ever, and the library cannot tell
///   that it is inside one. These only note what has happened; the program acts on it when its
///   dbus_connection_dispatch() has returned, or on another thread.
///
/// Where a receive thread runs (RemoteObject::startLoop()), leave its bus's connection to the
/// library, and open another one (dbus_bus_get_private()) for whatever the library does not do:
/// - signals are kept from filters that were added after the first proxy;
/// - requests to objects of the program that the receive thread reads are not answered.
class KESBLUETOOTH_API Connection {
public:
    Connection() = delete;

    /// Returns the connection, and opens it when the process has none to that bus.
    /// @param type DBUS_BUS_SYSTEM or DBUS_BUS_SESSION
    /// @return the shared connection with one more reference, or null when the bus cannot be
    ///         reached or the type is none (logged)
    ///
    /// Blocks while connecting. May be called from any thread.
    static DBusConnection* get(DBusBusType type);

    /// Drops one reference. @param connection may be null
    static void unref(DBusConnection* connection);

    /// Whether signals are delivered only when they come from the service that the subscribed proxy
    /// names, or from the bus itself. Off at first: signals are then told apart by interface and
    /// name only, whoever sends them, on which programs with a bus or peers of their own may rely.
    /// Turn it on unless every process on your buses is trusted: on the system bus any user can
    /// send signals that look like the Bluetooth daemon's, to all or to one process.
    /// @param on for all proxies on all buses of the process, from the next signal on
    /// @dbus org.freedesktop.DBus.GetNameOwner(s name) -> s, when a proxy subscribes to a service
    ///       whose owner is not known, and for each new sender: once, and again once a second while
    ///       a stranger goes on
    ///
    /// A service that is restarted is known again by its first signal. A process that sends signals
    /// before it owns the service's name is believed a second later at the latest.
    ///
    /// May be called at any time and from any thread, best before the first proxy.
    static void checkSenders(bool on);
};

} // namespace Bluetooth

#endif
