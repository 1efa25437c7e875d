// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/decode.h"

#include <cstdint>

namespace Kesbt {

namespace {

template <class Wire>
Json basicValue(DBusMessageIter& iter) {
    Wire value{};
    dbus_message_iter_get_basic(&iter, &value);
    return value;
}

Json decodeAll(DBusMessageIter& iter);

Json decodeContainer(DBusMessageIter& iter) {
    DBusMessageIter inner;
    dbus_message_iter_recurse(&iter, &inner);
    if (dbus_message_iter_get_arg_type(&iter) == DBUS_TYPE_VARIANT)
        return decodeAll(inner).at(0);
    if (dbus_message_iter_get_arg_type(&iter) != DBUS_TYPE_ARRAY ||
        dbus_message_iter_get_element_type(&iter) != DBUS_TYPE_DICT_ENTRY)
        return decodeAll(inner);
    Json object = Json::object();
    for (; dbus_message_iter_get_arg_type(&inner) == DBUS_TYPE_DICT_ENTRY;
         dbus_message_iter_next(&inner)) {
        DBusMessageIter entry;
        dbus_message_iter_recurse(&inner, &entry);
        Json pair = decodeAll(entry);
        object[display(pair.at(0))] = std::move(pair.at(1));
    }
    return object;
}

Json decodeOne(DBusMessageIter& iter) {
    switch (dbus_message_iter_get_arg_type(&iter)) {
    case DBUS_TYPE_STRING:
    case DBUS_TYPE_OBJECT_PATH:
    case DBUS_TYPE_SIGNATURE:
        return basicValue<const char*>(iter);
    case DBUS_TYPE_BOOLEAN:
        return basicValue<dbus_bool_t>(iter) != 0;
    case DBUS_TYPE_BYTE:
        return basicValue<std::uint8_t>(iter);
    case DBUS_TYPE_INT16:
        return basicValue<std::int16_t>(iter);
    case DBUS_TYPE_UINT16:
        return basicValue<std::uint16_t>(iter);
    case DBUS_TYPE_INT32:
        return basicValue<std::int32_t>(iter);
    case DBUS_TYPE_UINT32:
        return basicValue<std::uint32_t>(iter);
    case DBUS_TYPE_INT64:
        return basicValue<std::int64_t>(iter);
    case DBUS_TYPE_UINT64:
        return basicValue<std::uint64_t>(iter);
    case DBUS_TYPE_DOUBLE:
        return basicValue<double>(iter);
    case DBUS_TYPE_ARRAY:
    case DBUS_TYPE_STRUCT:
    case DBUS_TYPE_VARIANT:
        return decodeContainer(iter);
    default:
        return nullptr;
    }
}

Json decodeAll(DBusMessageIter& iter) {
    Json values = Json::array();
    for (; dbus_message_iter_get_arg_type(&iter) != DBUS_TYPE_INVALID;
         dbus_message_iter_next(&iter))
        values.push_back(decodeOne(iter));
    return values;
}

} // namespace

Json decodeArguments(DBusMessage* message) {
    DBusMessageIter iter;
    dbus_message_iter_init(message, &iter);
    return decodeAll(iter);
}

} // namespace Kesbt
