// SPDX-License-Identifier: LGPL-2.1-or-later
#include "client.h"
#include "names.h"

#include <dbus/dbus-glib-lowlevel.h>
#include <dbus/dbus-glib.h>

namespace Bench {

namespace {

class DBusGlibCaller : public Caller {
public:
    DBusGlibCaller()
        : m_connection(dbus_g_bus_get_private(DBUS_BUS_SYSTEM, nullptr, nullptr)),
          m_proxy(m_connection
                      ? dbus_g_proxy_new_for_name(m_connection, peerName, peerPath, peerInterface)
                      : nullptr) {
        require(m_proxy, "dbus-glib: no connection");
    }
    ~DBusGlibCaller() override {
        g_object_unref(m_proxy);
        dbus_connection_close(dbus_g_connection_get_connection(m_connection));
        dbus_g_connection_unref(m_connection);
    }

    void callNothing() override {
        require(dbus_g_proxy_call(m_proxy, "Nothing", nullptr, G_TYPE_INVALID, G_TYPE_INVALID),
                "dbus-glib: call");
    }
    std::size_t callText() override {
        char* text = nullptr;
        require(dbus_g_proxy_call(m_proxy, "Text", nullptr, G_TYPE_INVALID, G_TYPE_STRING, &text,
                                  G_TYPE_INVALID),
                "dbus-glib: text");
        const std::size_t length = std::string(text).size();
        g_free(text);
        return length;
    }
    std::size_t callProperties() override {
        GHashTable* table = nullptr;
        require(dbus_g_proxy_call(m_proxy, "Properties", nullptr, G_TYPE_INVALID,
                                  dbus_g_type_get_map("GHashTable", G_TYPE_STRING, G_TYPE_VALUE),
                                  &table, G_TYPE_INVALID),
                "dbus-glib: properties");
        const std::size_t entries = g_hash_table_size(table);
        g_hash_table_unref(table);
        return entries;
    }

private:
    DBusGConnection* m_connection;
    DBusGProxy* m_proxy;
};

} // namespace

const Library dbusglib = {
    "dbus-glib", []() -> std::unique_ptr<Caller> { return std::make_unique<DBusGlibCaller>(); },
    nullptr, // the main loop would have to be the process's own
    nullptr, // decodes only in calls
};

} // namespace Bench
