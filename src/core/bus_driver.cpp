// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/bus_driver.h"

#include <new>

namespace Bluetooth {

MessagePtr callBusDriver(BusLink* link, const char* method, const std::string& argument,
                         ScopedError& error, std::uint64_t* signalsBefore) {
    const char* text = argument.c_str();
    if (!link) {
        dbus_set_error_const(error, DBUS_ERROR_DISCONNECTED, "Not connected to the bus");
        return nullptr;
    }
    if (!dbus_validate_utf8(text, error))
        return nullptr;
    const MessagePtr message(dbus_message_new_method_call(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                                                          DBUS_INTERFACE_DBUS, method));
    if (!message ||
        !dbus_message_append_args(message.get(), DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID)) {
        error.setNoMemory();
        return nullptr;
    }
    try {
        return link->call(message.get(), -1, error.get(), signalsBefore);
    } catch (const std::bad_alloc&) {
        error.setNoMemory();
        return nullptr;
    }
}

} // namespace Bluetooth
