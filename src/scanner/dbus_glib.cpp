// SPDX-License-Identifier: LGPL-2.1-or-later
#include "scanner/dbus_glib.h"

#include "core/log.h"

#include <dlfcn.h>

namespace Bluetooth {

namespace {

constexpr const char* libraryName = "libdbus-glib-1.so.2";

template <class Function>
bool find(void* library, const char* name, Function& function) {
    function = reinterpret_cast<Function>(dlsym(library, name));
    return function;
}

/// Never unloaded: types that it registers stay for good.
bool loadInto(DBusGlib& glib) {
    void* const library = dlopen(libraryName, RTLD_NOW | RTLD_LOCAL);
    const bool isLoaded =
        library && find(library, "dbus_g_bus_get", glib.busGet) &&
        find(library, "dbus_g_connection_get_connection", glib.getConnection) &&
        find(library, "dbus_g_connection_lookup_g_object", glib.lookUpObject) &&
        find(library, "dbus_g_connection_register_g_object", glib.registerObject) &&
        find(library, "dbus_g_object_type_install_info", glib.installInfo) &&
        find(library, "dbus_g_proxy_call", glib.call) &&
        find(library, "dbus_g_proxy_get_bus_name", glib.getBusName) &&
        find(library, "dbus_g_proxy_get_interface", glib.getInterface) &&
        find(library, "dbus_g_proxy_get_path", glib.getPath) &&
        find(library, "dbus_g_proxy_new_for_name", glib.makeProxy) &&
        find(library, "dbus_g_thread_init", glib.initThreads);
    if (!isLoaded)
        logError(KES_HERE, "Failed to load dbus-glib, %s", dlerror());
    return isLoaded;
}

} // namespace

const DBusGlib* DBusGlib::load() {
    static DBusGlib glib{};
    static const bool isLoaded = loadInto(glib);
    return isLoaded ? &glib : nullptr;
}

} // namespace Bluetooth
