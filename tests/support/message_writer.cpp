// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/message_writer.h"

namespace Bluetooth::Test {

namespace {

std::string describeAll(DBusMessageIter& iter);

std::string describe(DBusMessageIter& iter) {
    const int type = dbus_message_iter_get_arg_type(&iter);
    const std::string prefix(1, static_cast<char>(type));
    if (!dbus_type_is_basic(type)) {
        DBusMessageIter inner;
        dbus_message_iter_recurse(&iter, &inner);
        return prefix + "(" + describeAll(inner) + ")";
    }
    DBusBasicValue value{};
    dbus_message_iter_get_basic(&iter, &value);
    switch (type) {
    case DBUS_TYPE_STRING:
    case DBUS_TYPE_OBJECT_PATH:
    case DBUS_TYPE_SIGNATURE:
        return prefix + ":" + value.str;
    case DBUS_TYPE_INT16:
        return prefix + ":" + std::to_string(value.i16);
    case DBUS_TYPE_INT32:
        return prefix + ":" + std::to_string(value.i32);
    case DBUS_TYPE_DOUBLE:
        return prefix + ":" + std::to_string(value.dbl);
    default:
        return prefix + ":" + std::to_string(value.u64);
    }
}

std::string describeAll(DBusMessageIter& iter) {
    std::string text;
    for (; dbus_message_iter_get_arg_type(&iter) != DBUS_TYPE_INVALID;
         dbus_message_iter_next(&iter))
        text += (text.empty() ? "" : " ") + describe(iter);
    return text;
}

} // namespace

std::string argumentsOf(DBusMessage* message) {
    DBusMessageIter iter;
    return dbus_message_iter_init(message, &iter) ? describeAll(iter) : "";
}

} // namespace Bluetooth::Test
