// SPDX-License-Identifier: LGPL-2.1-or-later
#include "client.h"
#include "names.h"

#include "core/dbus_ptr.h"

#include <atomic>
#include <cstdlib>
#include <thread>

namespace Bench {

namespace {

using Bluetooth::MessagePtr;
using Bluetooth::ScopedError;

/// A connection of its own, apart from the one that kesbluetooth uses.
class LibdbusConnection {
public:
    LibdbusConnection() : m_connection(dbus_bus_get_private(DBUS_BUS_SYSTEM, nullptr)) {
        require(m_connection, "libdbus: no connection");
        dbus_connection_set_exit_on_disconnect(m_connection, false);
    }
    ~LibdbusConnection() {
        dbus_connection_close(m_connection);
        dbus_connection_unref(m_connection);
    }
    LibdbusConnection(const LibdbusConnection&) = delete;
    LibdbusConnection& operator=(const LibdbusConnection&) = delete;
    operator DBusConnection*() const { return m_connection; }

    MessagePtr call(const char* method, const char* path = peerPath) const {
        const MessagePtr message(
            dbus_message_new_method_call(peerName, path, peerInterface, method));
        ScopedError error;
        MessagePtr reply(
            dbus_connection_send_with_reply_and_block(m_connection, message.get(), -1, error));
        if (!reply)
            throw std::runtime_error(std::string("libdbus: ") + error.message());
        return reply;
    }

private:
    DBusConnection* m_connection;
};

/// Looks at every value, whatever it is nested in, and keeps none.
std::size_t readThrough(DBusMessageIter& iter) {
    std::size_t entries = 0;
    if (dbus_message_iter_get_arg_type(&iter) == DBUS_TYPE_INVALID)
        return 0;
    do {
        const int type = dbus_message_iter_get_arg_type(&iter);
        if (type == DBUS_TYPE_ARRAY || type == DBUS_TYPE_VARIANT || type == DBUS_TYPE_DICT_ENTRY) {
            DBusMessageIter inner;
            dbus_message_iter_recurse(&iter, &inner);
            entries += readThrough(inner) + (type == DBUS_TYPE_DICT_ENTRY ? 1 : 0);
        } else {
            DBusBasicValue value;
            dbus_message_iter_get_basic(&iter, &value);
        }
    } while (dbus_message_iter_next(&iter));
    return entries;
}

std::size_t readThrough(DBusMessage* reply) {
    DBusMessageIter iter;
    dbus_message_iter_init(reply, &iter);
    return readThrough(iter);
}

std::size_t readText(DBusMessage* reply) {
    const char* text = nullptr;
    require(dbus_message_get_args(reply, nullptr, DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID),
            "libdbus: text");
    return std::string(text).size();
}

class RawCaller : public Caller {
public:
    void callNothing() override { m_connection.call("Nothing"); }
    std::size_t callText() override { return readText(m_connection.call("Text").get()); }
    std::size_t callProperties() override {
        return readThrough(m_connection.call("Properties").get());
    }

private:
    LibdbusConnection m_connection;
};

class SharingCaller : public Caller {
public:
    void callNothing() override { shared().callNothing(); }
    std::size_t callText() override { return shared().callText(); }
    std::size_t callProperties() override { return shared().callProperties(); }

private:
    static RawCaller& shared() {
        static RawCaller& caller = *new RawCaller;
        return caller;
    }
};

class RawListener : public Listener {
public:
    explicit RawListener(Handler handler) {
        const std::string rule = std::string("type='signal',interface='") + peerInterface +
                                 "',member='Tick',path='" + peerPath + "'";
        dbus_bus_add_match(m_connection, rule.c_str(), nullptr);
        dbus_connection_flush(m_connection);
        dbus_connection_add_filter(m_connection, filter, reinterpret_cast<void*>(handler), nullptr);
        m_thread = std::thread([this] {
            while (!m_stop)
                dbus_connection_read_write_dispatch(m_connection, 20);
        });
    }
    ~RawListener() override {
        m_stop = true;
        m_thread.join();
    }
    std::size_t callText() override { return readText(m_callConnection.call("Text").get()); }

private:
    static DBusHandlerResult filter(DBusConnection*, DBusMessage* message, void* handler) {
        if (!dbus_message_is_signal(message, peerInterface, "Tick"))
            return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
        const char* text = nullptr;
        dbus_message_get_args(message, nullptr, DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID);
        reinterpret_cast<Handler>(handler)(text);
        return DBUS_HANDLER_RESULT_HANDLED;
    }

    LibdbusConnection m_connection;
    LibdbusConnection
        m_callConnection; // a thread that reads would keep calls on its connection waiting
    std::atomic<bool> m_stop{false};
    std::thread m_thread;
};

class RawDecoder : public Decoder {
public:
    explicit RawDecoder(std::size_t entries)
        : m_reply(m_connection.call("Dictionary", adapterWith(entries).c_str())) {}
    std::size_t decode() override { return readThrough(m_reply.get()); }

private:
    LibdbusConnection m_connection;
    MessagePtr m_reply;
};

} // namespace

const Library libdbus = {
    "libdbus",
    []() -> std::unique_ptr<Caller> { return std::make_unique<RawCaller>(); },
    [](Listener::Handler handler) -> std::unique_ptr<Listener> {
        return std::make_unique<RawListener>(handler);
    },
    [](std::size_t entries) -> std::unique_ptr<Decoder> {
        return std::make_unique<RawDecoder>(entries);
    },
};

const Library libdbusShared = {
    "libdbus-shared",
    []() -> std::unique_ptr<Caller> { return std::make_unique<SharingCaller>(); },
    nullptr,
    nullptr,
};

void emitTicks(unsigned int count, unsigned int interval) {
    static const LibdbusConnection& connection = *new LibdbusConnection;
    const MessagePtr call(dbus_message_new_method_call(peerName, peerPath, peerInterface, "Emit"));
    dbus_message_append_args(call.get(), DBUS_TYPE_UINT32, &count, DBUS_TYPE_UINT32, &interval,
                             DBUS_TYPE_INVALID);
    require(MessagePtr(dbus_connection_send_with_reply_and_block(connection, call.get(), -1,
                                                                 nullptr)) != nullptr,
            "the peer does not answer");
}

std::string adapterWith(std::size_t count) {
    return adapters + std::to_string(count);
}

} // namespace Bench
