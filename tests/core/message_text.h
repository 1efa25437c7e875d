// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_MESSAGE_TEXT_H
#define KESBLUETOOTH_TESTS_MESSAGE_TEXT_H

#include "core/dbus_ptr.h"

#include <gio/gio.h>

namespace Bluetooth::Test {

/// Takes `message` and gives it arguments in the text form of GVariant, which has every D-Bus type:
/// "('Name', <uint16 5>)". Ends the process when that is no such text.
inline MessagePtr withArguments(GDBusMessage* message, const char* arguments) {
    g_dbus_message_set_serial(message, 1); // without one it would not be written
    g_dbus_message_set_body(message, g_variant_new_parsed(arguments));
    gsize size = 0;
    g_autofree guchar* bytes =
        g_dbus_message_to_blob(message, &size, G_DBUS_CAPABILITY_FLAGS_NONE, nullptr);
    g_object_unref(message);
    return MessagePtr(dbus_message_demarshal(reinterpret_cast<const char*>(bytes),
                                             static_cast<int>(size), nullptr));
}

inline MessagePtr replyWith(const char* arguments) {
    GDBusMessage* reply = g_dbus_message_new();
    g_dbus_message_set_message_type(reply, G_DBUS_MESSAGE_TYPE_METHOD_RETURN);
    g_dbus_message_set_reply_serial(reply, 1);
    return withArguments(reply, arguments);
}

inline MessagePtr signalWith(const char* path, const char* interface, const char* member,
                             const char* arguments) {
    return withArguments(g_dbus_message_new_signal(path, interface, member), arguments);
}

} // namespace Bluetooth::Test

#endif
