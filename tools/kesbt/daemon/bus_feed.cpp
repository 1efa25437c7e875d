// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"

#include "daemon/refusal.h"
#include "show/decode.h"

namespace Kesbt {

namespace {

constexpr char ownerChanged[] = "NameOwnerChanged";

struct Unref {
    void operator()(DBusMessage* message) const { dbus_message_unref(message); }
};

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
        const Failure failure =
            refusal("cannot watch the bus", textOf(error.name), textOf(error.message));
        dbus_error_free(&error);
        throw failure;
    }
}

int BusFeed::fd() const {
    int descriptor = -1;
    dbus_connection_get_unix_fd(m_connection.get(), &descriptor);
    return descriptor;
}

bool BusFeed::next(BusSignal& signal) {
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
        signal.arguments = decodeArguments(message.get());
        return true;
    }
    return false;
}

bool BusFeed::isDaemonChange(const BusSignal& signal) {
    return signal.interface == DBUS_INTERFACE_DBUS && signal.member == ownerChanged &&
           signal.arguments.size() == 3;
}

bool BusFeed::isDaemonGone(const BusSignal& signal) {
    return isDaemonChange(signal) && display(signal.arguments[2]).empty();
}

} // namespace Kesbt
