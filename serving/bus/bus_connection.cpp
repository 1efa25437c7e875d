// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/bus/bus_connection.h"

#include <gio/gunixfdlist.h>

#include <atomic>
#include <stdexcept>

namespace Bluetooth::Serving {

namespace {

constexpr const char* busName = "org.freedesktop.DBus";
constexpr const char* busPath = "/org/freedesktop/DBus";

[[noreturn]] void raise(const std::string& what, const ErrorOut& error) {
    throw std::runtime_error(what + ": " + error->message);
}

/// Splits GDBus's error into the name and the text that came over the bus.
BusError fromGlib(const GError* error) {
    const GlibPtr<GError> copy(g_error_copy(error));
    const GlibPtr<char> name(g_dbus_error_get_remote_error(copy.get()));
    if (name)
        g_dbus_error_strip_remote_error(copy.get());
    else if (g_error_matches(copy.get(), G_IO_ERROR, G_IO_ERROR_TIMED_OUT))
        return {"org.freedesktop.DBus.Error.NoReply", copy->message};
    return {name ? name.get() : "org.freedesktop.DBus.Error.Failed", copy->message};
}

} // namespace

std::string systemBusAddress() {
    ErrorOut error;
    const GlibPtr<char> address(
        g_dbus_address_get_for_bus_sync(G_BUS_TYPE_SYSTEM, nullptr, error.out()));
    if (!address)
        throw std::runtime_error(std::string("no system bus: ") + error->message);
    return address.get();
}

/// Where the reading thread leaves calls. `connection` is used on the main loop only, and null once
/// it is gone; calls that are still under way are dropped then.
struct BusConnection::Inbox {
    BusConnection* connection;
    CallHandler onCall;
};

namespace {

struct Delivery {
    std::shared_ptr<void> inbox;
    CallPtr call;
};

/// Orders the reading thread's writes before the main loop's reads. GLib does so too, but is not
/// built with ThreadSanitizer, which does not see it.
std::atomic<unsigned> handedOver{0};

} // namespace

BusConnection::BusConnection(const std::string& address, CallHandler onCall)
    : m_inbox(std::make_shared<Inbox>(Inbox{this, std::move(onCall)})) {
    ErrorOut error;
    const auto flags =
        static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                          G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
    m_connection = g_dbus_connection_new_for_address_sync(address.c_str(), flags, nullptr, nullptr,
                                                          error.out());
    if (!m_connection)
        raise("cannot connect to the bus at " + address, error);
    m_filter = g_dbus_connection_add_filter(
        m_connection, onMessage, new std::shared_ptr<Inbox>(m_inbox),
        [](gpointer data) { delete static_cast<std::shared_ptr<Inbox>*>(data); });
}

BusConnection::~BusConnection() {
    m_inbox->connection = nullptr;
    g_signal_handlers_disconnect_by_data(m_connection, this);
    if (m_clients)
        g_dbus_connection_signal_unsubscribe(m_connection, m_clients);
    g_dbus_connection_remove_filter(m_connection, m_filter);
    if (!g_dbus_connection_is_closed(m_connection)) {
        g_dbus_connection_flush_sync(m_connection, nullptr, nullptr);
        g_dbus_connection_close_sync(m_connection, nullptr, nullptr);
    }
    g_object_unref(m_connection);
}

GDBusMessage* BusConnection::onMessage(GDBusConnection* connection, GDBusMessage* message,
                                       gboolean incoming, gpointer data) {
    const char* interface = g_dbus_message_get_interface(message);
    // GDBus answers org.freedesktop.DBus.Peer on every path, as libdbus does.
    if (!incoming || g_dbus_message_get_message_type(message) != G_DBUS_MESSAGE_TYPE_METHOD_CALL ||
        (interface && g_str_equal(interface, "org.freedesktop.DBus.Peer")))
        return message;

    auto* delivery = new Delivery{*static_cast<std::shared_ptr<Inbox>*>(data),
                                  std::make_shared<Call>(connection, message)};
    GSource* source = g_idle_source_new();
    g_source_set_priority(source, G_PRIORITY_DEFAULT);
    g_source_set_callback(source, deliver, delivery,
                          [](gpointer done) { delete static_cast<Delivery*>(done); });
    handedOver.fetch_add(1, std::memory_order_release);
    g_source_attach(source, nullptr);
    g_source_unref(source);
    g_object_unref(message);
    return nullptr;
}

gboolean BusConnection::deliver(gpointer data) {
    handedOver.load(std::memory_order_acquire);
    const auto* delivery = static_cast<Delivery*>(data);
    const auto* inbox = static_cast<Inbox*>(delivery->inbox.get());
    if (inbox->connection)
        inbox->onCall(delivery->call);
    return G_SOURCE_REMOVE;
}

void BusConnection::own(const char* name) {
    constexpr guint32 doNotQueue = 4;
    constexpr guint32 owned = 1;
    ErrorOut error;
    const GlibPtr<GVariant> reply(g_dbus_connection_call_sync(
        m_connection, busName, busPath, busName, "RequestName", tuple(name, doNotQueue).get(),
        G_VARIANT_TYPE("(u)"), G_DBUS_CALL_FLAGS_NONE, -1, nullptr, error.out()));
    if (!reply)
        raise(std::string("cannot own ") + name, error);
    guint32 result = 0;
    g_variant_get(reply.get(), "(u)", &result);
    if (result != owned)
        throw std::runtime_error(std::string(name) +
                                 " is already owned on this bus; stop its owner first");
}

void BusConnection::watchClients(ClientGone onGone) {
    m_clientGone = std::move(onGone);
    m_clients = g_dbus_connection_signal_subscribe(
        m_connection, busName, busName, "NameOwnerChanged", busPath, nullptr,
        G_DBUS_SIGNAL_FLAGS_NONE,
        [](GDBusConnection*, const gchar*, const gchar*, const gchar*, const gchar*,
           GVariant* arguments, gpointer data) {
            const char* name = nullptr;
            const char* newOwner = nullptr;
            g_variant_get(arguments, "(&s&s&s)", &name, nullptr, &newOwner);
            if (*name == ':' && !*newOwner)
                static_cast<BusConnection*>(data)->m_clientGone(name);
        },
        this, nullptr);
}

void BusConnection::watchBus(std::function<void()> onEnd) {
    m_busEnded = std::move(onEnd);
    const auto closed = +[](GDBusConnection*, gboolean, GError*, gpointer data) {
        static_cast<BusConnection*>(data)->m_busEnded();
    };
    g_signal_connect(m_connection, "closed", G_CALLBACK(closed), this);
}

void BusConnection::emit(const std::string& path, const std::string& interface,
                         const std::string& member, const Value& arguments) {
    GDBusMessage* message =
        g_dbus_message_new_signal(path.c_str(), interface.c_str(), member.c_str());
    if (arguments)
        g_dbus_message_set_body(message, arguments.get());
    g_dbus_connection_send_message(m_connection, message, G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr,
                                   nullptr);
    g_object_unref(message);
}

void BusConnection::call(const std::string& destination, const std::string& path,
                         const std::string& interface, const std::string& member,
                         const Value& arguments, int timeout, GCancellable* cancellable,
                         AnswerHandler answered, int descriptor) {
    const auto finished = [](GObject* source, GAsyncResult* result, gpointer data) {
        const std::unique_ptr<AnswerHandler> handler(static_cast<AnswerHandler*>(data));
        ErrorOut error;
        const GlibPtr<GVariant> reply(g_dbus_connection_call_with_unix_fd_list_finish(
            G_DBUS_CONNECTION(source), nullptr, result, error.out()));
        if (reply)
            (*handler)({Value(reply.get()), {}, false});
        else if (!g_error_matches(error.get(), G_IO_ERROR, G_IO_ERROR_CANCELLED))
            (*handler)({{}, fromGlib(error.get()), true});
    };
    const ObjectPtr<GUnixFDList> descriptors(descriptor < 0 ? nullptr : g_unix_fd_list_new());
    if (descriptors)
        g_unix_fd_list_append(descriptors.get(), descriptor, nullptr);
    g_dbus_connection_call_with_unix_fd_list(
        m_connection, destination.c_str(), path.c_str(), interface.c_str(), member.c_str(),
        arguments.get(), nullptr, G_DBUS_CALL_FLAGS_NO_AUTO_START, timeout, descriptors.get(),
        cancellable, finished, new AnswerHandler(std::move(answered)));
}

void BusConnection::send(const std::string& destination, const std::string& path,
                         const std::string& interface, const std::string& member,
                         const Value& arguments) {
    g_dbus_connection_call(m_connection, destination.c_str(), path.c_str(), interface.c_str(),
                           member.c_str(), arguments.get(), nullptr,
                           G_DBUS_CALL_FLAGS_NO_AUTO_START, -1, nullptr, nullptr, nullptr);
}

void BusConnection::afterRoundTrip(std::function<void()> next) {
    call(busName, busPath, busName, "GetId", {}, -1, nullptr,
         [next = std::move(next)](const CallResult&) { next(); });
}

} // namespace Bluetooth::Serving
