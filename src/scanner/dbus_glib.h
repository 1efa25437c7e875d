// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_DBUS_GLIB_H
#define KESBLUETOOTH_SCANNER_DBUS_GLIB_H

#include <dbus/dbus-glib-lowlevel.h>
#include <dbus/dbus-glib.h>

namespace Bluetooth {

/// What is used of dbus-glib. Its library is loaded when an object is served for the first time:
/// it brings GIO and the libraries of that, which programs that serve none need not link at their
/// start.
struct DBusGlib {
    /// @return null (logged) when the library cannot be loaded
    static const DBusGlib* load();

    decltype(&dbus_g_bus_get) busGet;
    decltype(&dbus_g_connection_get_connection) getConnection;
    decltype(&dbus_g_connection_lookup_g_object) lookUpObject;
    decltype(&dbus_g_connection_register_g_object) registerObject;
    decltype(&dbus_g_object_type_install_info) installInfo;
    decltype(&dbus_g_proxy_call) call;
    decltype(&dbus_g_proxy_get_bus_name) getBusName;
    decltype(&dbus_g_proxy_get_interface) getInterface;
    decltype(&dbus_g_proxy_get_path) getPath;
    decltype(&dbus_g_proxy_new_for_name) makeProxy;
    decltype(&dbus_g_thread_init) initThreads;
};

} // namespace Bluetooth

#endif
