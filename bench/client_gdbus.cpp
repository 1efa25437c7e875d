// SPDX-License-Identifier: LGPL-2.1-or-later
#include "client.h"
#include "names.h"

#include <gio/gio.h>

#include <thread>
#include <variant>

namespace Bench {

namespace {

struct GFree {
    void operator()(GVariant* value) const { g_variant_unref(value); }
    void operator()(GObject* object) const { g_object_unref(object); }
    void operator()(GMainContext* context) const { g_main_context_unref(context); }
    void operator()(GMainLoop* loop) const { g_main_loop_unref(loop); }
};
template <class Type>
using GPtr = std::unique_ptr<Type, GFree>;

class GdbusConnection {
public:
    GdbusConnection() : m_connection(g_bus_get_sync(G_BUS_TYPE_SYSTEM, nullptr, nullptr)) {
        require(m_connection, "GDBus: no connection");
    }
    ~GdbusConnection() { g_object_unref(m_connection); }
    GdbusConnection(const GdbusConnection&) = delete;
    GdbusConnection& operator=(const GdbusConnection&) = delete;
    operator GDBusConnection*() const { return m_connection; }

    GPtr<GVariant> call(const char* method, const char* replyType,
                        const char* path = peerPath) const {
        GError* error = nullptr;
        GPtr<GVariant> reply(g_dbus_connection_call_sync(
            m_connection, peerName, path, peerInterface, method, nullptr, G_VARIANT_TYPE(replyType),
            G_DBUS_CALL_FLAGS_NONE, -1, nullptr, &error));
        if (!reply)
            throw std::runtime_error(std::string("GDBus: ") + error->message);
        return reply;
    }
    std::size_t callText() const {
        const GPtr<GVariant> reply = call("Text", "(s)");
        const char* text = nullptr;
        g_variant_get(reply.get(), "(&s)", &text);
        return std::string(text).size();
    }

private:
    GDBusConnection* m_connection;
};

class GDBusCaller : public Caller {
public:
    void callNothing() override { m_connection.call("Nothing", "()"); }
    std::size_t callText() override { return m_connection.callText(); }
    /// The reply is a GVariant tree already; its entries are put into a table, as callers do it.
    std::size_t callProperties() override {
        const GPtr<GVariant> reply = m_connection.call("Properties", "(a{sv})");
        GHashTable* table =
            g_hash_table_new_full(g_str_hash, g_str_equal, g_free, [](gpointer value) {
                g_variant_unref(static_cast<GVariant*>(value));
            });
        GVariantIter* iter = nullptr;
        g_variant_get(reply.get(), "(a{sv})", &iter);
        char* name = nullptr;
        GVariant* value = nullptr;
        while (g_variant_iter_next(iter, "{sv}", &name, &value))
            g_hash_table_insert(table, name, value);
        g_variant_iter_free(iter);
        const std::size_t entries = g_hash_table_size(table);
        g_hash_table_unref(table);
        return entries;
    }

private:
    GdbusConnection m_connection;
};

class GDBusListener : public Listener {
public:
    explicit GDBusListener(Handler handler)
        : m_context(g_main_context_new()), m_loop(g_main_loop_new(m_context.get(), false)) {
        g_main_context_push_thread_default(m_context.get()); // where the callback is called
        m_subscription = g_dbus_connection_signal_subscribe(
            m_connection, peerName, peerInterface, "Tick", peerPath, nullptr,
            G_DBUS_SIGNAL_FLAGS_NONE, tick, reinterpret_cast<gpointer>(handler), nullptr);
        g_main_context_pop_thread_default(m_context.get());
        m_connection.callText(); // the bus has the rule now
        m_thread = std::thread([this] { g_main_loop_run(m_loop.get()); });
    }
    ~GDBusListener() override {
        g_dbus_connection_signal_unsubscribe(m_connection, m_subscription);
        g_main_loop_quit(m_loop.get());
        m_thread.join();
    }
    std::size_t callText() override { return m_connection.callText(); }

private:
    static void tick(GDBusConnection*, const char*, const char*, const char*, const char*,
                     GVariant* arguments, gpointer handler) {
        const char* text = nullptr;
        g_variant_get(arguments, "(&s)", &text);
        reinterpret_cast<Handler>(handler)(text);
    }

    GdbusConnection m_connection;
    GPtr<GMainContext> m_context;
    GPtr<GMainLoop> m_loop;
    guint m_subscription = 0;
    std::thread m_thread;
};

class GDBusDecoder : public Decoder {
public:
    explicit GDBusDecoder(std::size_t entries)
        : m_reply(m_connection.call("Dictionary", "(a{sv})", adapterWith(entries).c_str())) {}
    std::size_t decode() override {
        std::vector<std::pair<std::string, std::variant<std::uint32_t, bool, std::string>>> dict;
        GVariantIter* iter = nullptr;
        g_variant_get(m_reply.get(), "(a{sv})", &iter);
        const char* name = nullptr;
        GVariant* value = nullptr;
        while (g_variant_iter_loop(iter, "{&sv}", &name, &value)) {
            if (g_variant_is_of_type(value, G_VARIANT_TYPE_UINT32))
                dict.emplace_back(name, g_variant_get_uint32(value));
            else if (g_variant_is_of_type(value, G_VARIANT_TYPE_BOOLEAN))
                dict.emplace_back(name, g_variant_get_boolean(value) != 0);
            else
                dict.emplace_back(name, std::string(g_variant_get_string(value, nullptr)));
        }
        g_variant_iter_free(iter);
        return dict.size();
    }

private:
    GdbusConnection m_connection;
    GPtr<GVariant> m_reply;
};

} // namespace

const Library gdbus = {
    "GDBus",
    []() -> std::unique_ptr<Caller> { return std::make_unique<GDBusCaller>(); },
    [](Listener::Handler handler) -> std::unique_ptr<Listener> {
        return std::make_unique<GDBusListener>(handler);
    },
    [](std::size_t entries) -> std::unique_ptr<Decoder> {
        return std::make_unique<GDBusDecoder>(entries);
    },
};

} // namespace Bench
