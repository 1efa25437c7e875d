// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/match_rule.h"

#include <new>

namespace Bluetooth {

namespace {

/// A call like any other: libdbus's own functions would hold the connection while they wait.
bool changeMatch(BusLink* link, const char* method, const std::string& rule, ScopedError& error) {
    const char* text = rule.c_str();
    if (!link) {
        dbus_set_error_const(error, DBUS_ERROR_DISCONNECTED, "Not connected to the bus");
        return false;
    }
    if (!dbus_validate_utf8(text, error))
        return false;
    const MessagePtr message(dbus_message_new_method_call(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                                                          DBUS_INTERFACE_DBUS, method));
    if (!message ||
        !dbus_message_append_args(message.get(), DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID)) {
        error.setNoMemory();
        return false;
    }
    try {
        return link->call(message.get(), -1, error.get()) != nullptr;
    } catch (const std::bad_alloc&) {
        error.setNoMemory();
        return false;
    }
}

} // namespace

std::string signalRule(const std::string& interface, const std::string& member,
                       const std::string& path) {
    return "type='signal',interface='" + interface + "',member='" + member + "',path='" + path +
           "'";
}

bool addMatch(BusLink* link, const std::string& rule, ScopedError& error) {
    return changeMatch(link, "AddMatch", rule, error);
}

bool removeMatch(BusLink* link, const std::string& rule, ScopedError& error) {
    return changeMatch(link, "RemoveMatch", rule, error);
}

} // namespace Bluetooth
