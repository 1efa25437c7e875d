// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/bus/call.h"

#include <gio/gunixfdlist.h>

namespace Bluetooth::Serving {

namespace {

std::string orEmpty(const char* text) {
    return text ? text : "";
}

} // namespace

Call::Call(GDBusConnection* connection, GDBusMessage* message)
    : m_connection(G_DBUS_CONNECTION(g_object_ref(connection))),
      m_message(G_DBUS_MESSAGE(g_object_ref(message))) {}

Call::~Call() {
    g_object_unref(m_message);
    g_object_unref(m_connection);
}

std::string Call::sender() const {
    return orEmpty(g_dbus_message_get_sender(m_message));
}

std::string Call::path() const {
    return orEmpty(g_dbus_message_get_path(m_message));
}

std::string Call::interface() const {
    return orEmpty(g_dbus_message_get_interface(m_message));
}

std::string Call::member() const {
    return orEmpty(g_dbus_message_get_member(m_message));
}

std::string Call::signature() const {
    return orEmpty(g_dbus_message_get_signature(m_message));
}

Value Call::arguments() const {
    GVariant* body = g_dbus_message_get_body(m_message);
    return body ? Value(body) : Value(g_variant_new_tuple(nullptr, 0));
}

Value Call::argument(gsize index) const {
    const GlibPtr<GVariant> child(g_variant_get_child_value(arguments().get(), index));
    return child.get();
}

Value Call::content(gsize index) const {
    const GlibPtr<GVariant> inner(g_variant_get_variant(argument(index).get()));
    return inner.get();
}

bool Call::expectsReply() const {
    return (g_dbus_message_get_flags(m_message) & G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED) == 0;
}

void Call::reply(const Value& results) {
    GDBusMessage* reply = g_dbus_message_new_method_reply(m_message);
    if (results)
        g_dbus_message_set_body(reply, results.get());
    send(reply);
}

void Call::replyDescriptor(int descriptor, const std::vector<Value>& others) {
    const ObjectPtr<GUnixFDList> descriptors(g_unix_fd_list_new());
    const gint index = g_unix_fd_list_append(descriptors.get(), descriptor, nullptr);
    if (index < 0)
        return fail({"org.freedesktop.DBus.Error.LimitsExceeded", "Too many open files"});
    GVariantBuilder body;
    g_variant_builder_init(&body, G_VARIANT_TYPE_TUPLE);
    g_variant_builder_add(&body, "h", index);
    for (const Value& other : others)
        g_variant_builder_add_value(&body, other.get());
    GDBusMessage* reply = g_dbus_message_new_method_reply(m_message);
    g_dbus_message_set_body(reply, g_variant_builder_end(&body));
    g_dbus_message_set_unix_fd_list(reply, descriptors.get());
    send(reply);
}

void Call::fail(const BusError& error) {
    send(
        g_dbus_message_new_method_error_literal(m_message, error.name.c_str(), error.text.c_str()));
}

void Call::send(GDBusMessage* reply) {
    if (!m_answered && expectsReply())
        g_dbus_connection_send_message(m_connection, reply, G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr,
                                       nullptr);
    m_answered = true;
    g_object_unref(reply);
}

} // namespace Bluetooth::Serving
