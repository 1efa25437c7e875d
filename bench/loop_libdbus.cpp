// SPDX-License-Identifier: LGPL-2.1-or-later
// The least that a program which waits for signals needs of memory: prints "ready" and waits.

#include "names.h"

#include <dbus/dbus.h>

#include <cstdio>
#include <string>

int main() {
    DBusConnection* connection = dbus_bus_get(DBUS_BUS_SYSTEM, nullptr);
    if (!connection)
        return 1;
    const std::string rule = std::string("type='signal',interface='") + Bench::peerInterface + "'";
    dbus_bus_add_match(connection, rule.c_str(), nullptr);
    dbus_connection_flush(connection);
    (void)std::puts("ready");
    (void)std::fflush(stdout);
    while (dbus_connection_read_write_dispatch(connection, -1)) {
    }
    return 0;
}
