// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/connection.h>

#include "core/bus_link.h"
#include "core/dbus_ptr.h"
#include "core/log.h"

namespace Bluetooth {

DBusConnection* Connection::get(DBusBusType type) {
    ScopedError error;
    DBusConnection* connection = dbus_bus_get(type, error);
    BusLink* link = BusLink::of(connection);
    if (link && !link->checkOpen()) {
        dbus_connection_unref(connection);
        connection = dbus_bus_get(type, nullptr);
    }
    if (!connection)
        logError(KES_HERE, "Failed to get bus connection");
    else
        dbus_connection_set_exit_on_disconnect(connection, false);
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
