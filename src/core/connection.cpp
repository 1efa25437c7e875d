// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/connection.h>

#include "core/bus_link.h"
#include "core/log.h"

namespace Bluetooth {

namespace {

/// libdbus ends the process when the bus goes away, unless told otherwise before it is noticed. And
/// it takes a type that is none for a fault of the program, and ends that too.
DBusConnection* connect(DBusBusType type) {
    const bool isType = static_cast<unsigned int>(type) <= DBUS_BUS_STARTER;
    DBusConnection* connection = isType ? dbus_bus_get(type, nullptr) : nullptr;
    if (connection)
        dbus_connection_set_exit_on_disconnect(connection, false);
    return connection;
}

} // namespace

DBusConnection* Connection::get(DBusBusType type) {
    DBusConnection* connection = connect(type);
    BusLink* link = BusLink::of(connection);
    if (link && !link->checkOpen()) {
        dbus_connection_unref(connection);
        connection = connect(type);
    }
    if (!connection)
        logError(KES_HERE, "Failed to get bus connection");
    return connection;
}

void Connection::checkSenders(bool on) {
    SenderCheck::turn(on);
}

void Connection::unref(DBusConnection* connection) {
    if (connection)
        dbus_connection_unref(connection);
}

} // namespace Bluetooth
