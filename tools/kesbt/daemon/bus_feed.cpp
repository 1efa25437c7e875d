// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"

#include "daemon/refusal.h"
#include "show/decode.h"

namespace Kesbt {

namespace {

constexpr char daemonName[] = "org.bluez";
constexpr char ownerChanged[] = "NameOwnerChanged";
constexpr char ownerRule[] =
    "type='signal',sender='org.freedesktop.DBus',member='NameOwnerChanged',arg0='org.bluez'";
constexpr char daemonRule[] = "type='signal',sender='org.bluez'";

struct Unref {
    void operator()(DBusMessage* message) const { dbus_message_unref(message); }
};

using Message = std::unique_ptr<DBusMessage, Unref>;

std::string textOf(const char* text) {
    return text ? text : "";
}

/// @return the daemon's unique name; "" when it is not there
std::string daemonOn(DBusConnection* bus) {
    const Message call(dbus_message_new_method_call(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS,
                                                    DBUS_INTERFACE_DBUS, "GetNameOwner"));
    const char* name = daemonName;
    dbus_message_append_args(call.get(), DBUS_TYPE_STRING, &name, DBUS_TYPE_INVALID);
    const Message reply(dbus_connection_send_with_reply_and_block(bus, call.get(), -1, nullptr));
    const char* owner = nullptr;
    if (reply)
        dbus_message_get_args(reply.get(), nullptr, DBUS_TYPE_STRING, &owner, DBUS_TYPE_INVALID);
    return textOf(owner);
}

} // namespace

void BusFeed::Close::operator()(DBusConnection* connection) const {
    dbus_connection_close(connection);
    dbus_connection_unref(connection);
}

BusFeed::BusFeed(Signals wanted) : m_connection(dbus_bus_get_private(DBUS_BUS_SYSTEM, nullptr)) {
    if (!m_connection)
        throw daemonAbsent();
    dbus_connection_set_exit_on_disconnect(m_connection.get(), false);
    watch(ownerRule);
    if (wanted == Signals::All)
        watch(daemonRule);
    m_daemon = daemonOn(m_connection.get()); // from now on by ownerRule
}

void BusFeed::watch(const char* rule) {
    DBusError error = DBUS_ERROR_INIT;
    dbus_bus_add_match(m_connection.get(), rule, &error);
    if (!dbus_error_is_set(&error))
        return;
    const Failure failure =
        refusal("cannot watch the bus", textOf(error.name), textOf(error.message));
    dbus_error_free(&error);
    throw failure;
}

int BusFeed::fd() const {
    int descriptor = -1;
    dbus_connection_get_unix_fd(m_connection.get(), &descriptor);
    return descriptor;
}

bool BusFeed::next(BusSignal& signal) {
    DBusConnection* connection = m_connection.get();
    dbus_connection_read_write(connection, 0);
    while (const Message message{dbus_connection_pop_message(connection)}) {
        if (dbus_message_is_signal(message.get(), DBUS_INTERFACE_LOCAL, "Disconnected"))
            throw daemonAbsent();
        if (take(message.get(), signal))
            return true;
    }
    return false;
}

/// @return whether it is a signal that is wanted
bool BusFeed::take(DBusMessage* message, BusSignal& signal) {
    const bool ofBus = dbus_message_has_sender(message, DBUS_SERVICE_DBUS) != 0;
    const bool wanted =
        ofBus ? dbus_message_is_signal(message, DBUS_INTERFACE_DBUS, ownerChanged) != 0
              : dbus_message_get_type(message) == DBUS_MESSAGE_TYPE_SIGNAL &&
                    dbus_message_has_sender(message, m_daemon.c_str()) != 0;
    if (!wanted)
        return false;
    signal.path = textOf(dbus_message_get_path(message));
    signal.interface = textOf(dbus_message_get_interface(message));
    signal.member = textOf(dbus_message_get_member(message));
    signal.arguments = decodeArguments(message);
    if (isDaemonChange(signal))
        m_daemon = display(signal.arguments[2]);
    return true;
}

bool BusFeed::isDaemonChange(const BusSignal& signal) {
    return signal.interface == DBUS_INTERFACE_DBUS && signal.member == ownerChanged &&
           signal.arguments.size() == 3;
}

bool BusFeed::isDaemonGone(const BusSignal& signal) {
    return isDaemonChange(signal) && display(signal.arguments[2]).empty();
}

} // namespace Kesbt
