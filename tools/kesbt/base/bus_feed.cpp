#include "base/bus_feed.h"

#include "base/failure.h"

#include <cstdint>

namespace Kesbt {

namespace {

constexpr char ownerChanged[] = "NameOwnerChanged";

struct Unref {
    void operator()(DBusMessage* message) const { dbus_message_unref(message); }
};

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

std::string textOf(const char* text) {
    return text ? text : "";
}

} // namespace

const char* const BusFeed::daemonRule =
    "type='signal',sender='org.freedesktop.DBus',member='NameOwnerChanged',arg0='org.bluez'";

void BusFeed::Close::operator()(DBusConnection* connection) const {
    dbus_connection_close(connection);
    dbus_connection_unref(connection);
}

BusFeed::BusFeed(const std::vector<std::string>& rules)
    : m_connection(dbus_bus_get_private(DBUS_BUS_SYSTEM, nullptr)) {
    if (!m_connection)
        throw daemonAbsent();
    dbus_connection_set_exit_on_disconnect(m_connection.get(), false);
    for (const std::string& rule : rules) {
        DBusError error = DBUS_ERROR_INIT;
        dbus_bus_add_match(m_connection.get(), rule.c_str(), &error);
        if (!dbus_error_is_set(&error))
            continue;
        const Failure failure = refusal("cannot watch the bus", textOf(error.message));
        dbus_error_free(&error);
        throw failure;
    }
}

int BusFeed::fd() const {
    int descriptor = -1;
    dbus_connection_get_unix_fd(m_connection.get(), &descriptor);
    return descriptor;
}

bool BusFeed::next(Signal& signal) {
    DBusConnection* connection = m_connection.get();
    dbus_connection_read_write(connection, 0);
    while (const std::unique_ptr<DBusMessage, Unref> message{
        dbus_connection_pop_message(connection)}) {
        if (dbus_message_is_signal(message.get(), DBUS_INTERFACE_LOCAL, "Disconnected"))
            throw daemonAbsent();
        const bool ofBus = dbus_message_has_interface(message.get(), DBUS_INTERFACE_DBUS);
        const bool wanted = dbus_message_get_type(message.get()) == DBUS_MESSAGE_TYPE_SIGNAL &&
                            (!ofBus || dbus_message_has_member(message.get(), ownerChanged));
        if (!wanted)
            continue;
        signal.path = textOf(dbus_message_get_path(message.get()));
        signal.interface = textOf(dbus_message_get_interface(message.get()));
        signal.member = textOf(dbus_message_get_member(message.get()));
        DBusMessageIter iter;
        dbus_message_iter_init(message.get(), &iter);
        signal.arguments = decodeAll(iter);
        return true;
    }
    return false;
}

bool BusFeed::isDaemonChange(const Signal& signal) {
    return signal.interface == DBUS_INTERFACE_DBUS && signal.member == ownerChanged &&
           signal.arguments.size() == 3;
}

bool BusFeed::isDaemonGone(const Signal& signal) {
    return isDaemonChange(signal) && signal.arguments[2] == "";
}

} // namespace Kesbt
