// SPDX-License-Identifier: LGPL-2.1-or-later
// The other side of every measurement: a process that answers calls and emits signals through raw
// libdbus, with replies that were made beforehand, so that its own cost is small and always the
// same.
//
//   kesbluetooth-bench-peer BUS-ADDRESS      prints "ready" when it owns its name

#include "core/dbus_ptr.h"
#include "names.h"

#include <poll.h>
#include <sys/prctl.h>
#include <time.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>

namespace {

using Bluetooth::MessagePtr;

constexpr long long second = 1000000000;

long long now() {
    timespec time = {};
    clock_gettime(CLOCK_MONOTONIC, &time);
    return time.tv_sec * second + time.tv_nsec;
}

/// Appends arguments to a message, or elements and entries to a container.
class Arguments {
public:
    explicit Arguments(DBusMessage* message) { dbus_message_iter_init_append(message, &m_iter); }

    void text(const char* value) { basic(DBUS_TYPE_STRING, &value); }
    void path(const char* value) { basic(DBUS_TYPE_OBJECT_PATH, &value); }
    void basic(int type, const void* value) {
        dbus_message_iter_append_basic(&m_iter, type, value);
    }
    template <class Build>
    void container(int type, const char* signature, Build build) {
        Arguments inner;
        dbus_message_iter_open_container(&m_iter, type, signature, &inner.m_iter);
        build(inner);
        dbus_message_iter_close_container(&m_iter, &inner.m_iter);
    }
    template <class Build>
    void property(const char* name, const char* signature, Build build) {
        container(DBUS_TYPE_DICT_ENTRY, nullptr, [&](Arguments& entry) {
            entry.text(name);
            entry.container(DBUS_TYPE_VARIANT, signature, build);
        });
    }
    void textProperty(const char* name, const char* value) {
        property(name, "s", [&](Arguments& variant) { variant.text(value); });
    }
    void boolProperty(const char* name, bool value) {
        const dbus_bool_t boolean = value;
        property(name, "b",
                 [&](Arguments& variant) { variant.basic(DBUS_TYPE_BOOLEAN, &boolean); });
    }

private:
    Arguments() = default;
    DBusMessageIter m_iter = {};
};

/// The 15 properties of a device as the Bluetooth daemon gives them.
void appendProperties(Arguments& dict) {
    dict.textProperty("Address", "00:11:22:33:44:55");
    dict.textProperty("Name", "Headphones of the living room");
    dict.textProperty("Alias", "Headphones");
    dict.property("Class", "u", [](Arguments& variant) {
        const dbus_uint32_t audio = 0x240404;
        variant.basic(DBUS_TYPE_UINT32, &audio);
    });
    dict.textProperty("Icon", "audio-card");
    dict.boolProperty("Paired", true);
    dict.boolProperty("Trusted", true);
    dict.boolProperty("Blocked", false);
    dict.boolProperty("Connected", true);
    dict.boolProperty("LegacyPairing", false);
    dict.property("RSSI", "n", [](Arguments& variant) {
        const dbus_int16_t strength = -60;
        variant.basic(DBUS_TYPE_INT16, &strength);
    });
    dict.property("Vendor", "q", [](Arguments& variant) {
        const dbus_uint16_t vendor = 0x000f;
        variant.basic(DBUS_TYPE_UINT16, &vendor);
    });
    dict.property("UUIDs", "as", [](Arguments& variant) {
        variant.container(DBUS_TYPE_ARRAY, "s", [](Arguments& array) {
            for (const char* id : {"00001108", "0000110b", "0000110c", "0000110e", "0000111e"})
                array.text((std::string(id) + "-0000-1000-8000-00805f9b34fb").c_str());
        });
    });
    dict.property("Services", "ao", [](Arguments& variant) {
        variant.container(DBUS_TYPE_ARRAY, "o", [](Arguments& array) {
            array.path("/org/bluez/1/hci0/dev_00_11_22_33_44_55/service1");
            array.path("/org/bluez/1/hci0/dev_00_11_22_33_44_55/service2");
        });
    });
    dict.property("Adapter", "o", [](Arguments& variant) { variant.path("/org/bluez/1/hci0"); });
}

/// `count` entries, by turns of the types that properties have most.
void appendEntries(Arguments& dict, unsigned int count) {
    for (unsigned int i = 0; i < count; ++i) {
        const std::string name = "Property" + std::to_string(i);
        switch (i % 3) {
        case 0:
            dict.textProperty(name.c_str(), "Headphones of the living room");
            break;
        case 1:
            dict.property(name.c_str(), "u", [i](Arguments& variant) {
                const dbus_uint32_t number = i;
                variant.basic(DBUS_TYPE_UINT32, &number);
            });
            break;
        default:
            dict.boolProperty(name.c_str(), true);
        }
    }
}

void appendDevices(Arguments& array, unsigned int count) {
    char path[64];
    for (unsigned int i = 0; i < count; ++i) {
        (void)std::snprintf(path, sizeof path, "/org/bluez/1/hci0/dev_00_11_22_33_%02X_%02X",
                            i / 256, i % 256);
        array.path(path);
    }
}

/// The number with which an adapter's path ends.
unsigned int numberIn(const char* path) {
    return static_cast<unsigned int>(
        std::strtoul(path + std::strlen(Bench::adapters), nullptr, 10));
}

class Peer {
public:
    explicit Peer(DBusConnection* connection) : m_connection(connection) {}

    void serve() {
        dbus_connection_add_filter(m_connection, filter, this, nullptr);
        while (dbus_connection_read_write(m_connection, 0)) {
            while (dbus_connection_dispatch(m_connection) == DBUS_DISPATCH_DATA_REMAINS) {
            }
            emitDueSignal();
            wait();
        }
    }

private:
    static DBusHandlerResult filter(DBusConnection*, DBusMessage* message, void* data) {
        return static_cast<Peer*>(data)->handle(message);
    }

    DBusHandlerResult handle(DBusMessage* message) {
        if (dbus_message_get_type(message) != DBUS_MESSAGE_TYPE_METHOD_CALL)
            return DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
        const std::string member = dbus_message_get_member(message);
        if (member == "Emit") {
            dbus_uint32_t interval = 0;
            dbus_message_get_args(message, nullptr, DBUS_TYPE_UINT32, &m_signalsLeft,
                                  DBUS_TYPE_UINT32, &interval, DBUS_TYPE_INVALID);
            m_interval = interval * 1000LL;
            m_nextSignal = now() + m_interval;
        }
        const MessagePtr reply(dbus_message_copy(prepared(member, message)));
        dbus_message_set_reply_serial(reply.get(), dbus_message_get_serial(message));
        dbus_message_set_destination(reply.get(), dbus_message_get_sender(message));
        dbus_connection_send(m_connection, reply.get(), nullptr);
        return DBUS_HANDLER_RESULT_HANDLED;
    }

    /// The reply to such a call, made the first time that it is asked for.
    DBusMessage* prepared(const std::string& member, DBusMessage* call) {
        const char* path = dbus_message_get_path(call);
        MessagePtr& reply = m_replies[member + path];
        if (reply)
            return reply.get();
        reply.reset(dbus_message_new_method_return(call));
        Arguments arguments(reply.get());
        if (member == "Text")
            arguments.text("00:11:22:33:44:55");
        else if (member == "Properties")
            arguments.container(DBUS_TYPE_ARRAY, "{sv}", appendProperties);
        else if (member == "Dictionary")
            arguments.container(DBUS_TYPE_ARRAY, "{sv}",
                                [&](Arguments& dict) { appendEntries(dict, numberIn(path)); });
        else if (member == "ListDevices")
            arguments.container(DBUS_TYPE_ARRAY, "o",
                                [&](Arguments& array) { appendDevices(array, numberIn(path)); });
        return reply.get();
    }

    /// Emits Tick with the time of its emission, in nanoseconds, as a text.
    void emitDueSignal() {
        if (m_signalsLeft == 0 || now() < m_nextSignal)
            return;
        --m_signalsLeft;
        m_nextSignal += m_interval;
        const MessagePtr signal(
            dbus_message_new_signal(Bench::peerPath, Bench::peerInterface, "Tick"));
        Arguments(signal.get()).text(std::to_string(now()).c_str());
        dbus_connection_send(m_connection, signal.get(), nullptr);
    }

    void wait() {
        pollfd socket = {-1, POLLIN, 0};
        dbus_connection_get_unix_fd(m_connection, &socket.fd);
        if (dbus_connection_has_messages_to_send(m_connection))
            socket.events |= POLLOUT; // sleeps: the bus may have only this processor to read on
        const long long left = std::max(m_nextSignal - now(), 0LL);
        const timespec limit = {left / second, left % second};
        ppoll(&socket, 1, m_signalsLeft > 0 ? &limit : nullptr, nullptr);
    }

    DBusConnection* m_connection;
    std::map<std::string, MessagePtr> m_replies;
    dbus_uint32_t m_signalsLeft = 0;
    long long m_interval = 0;
    long long m_nextSignal = 0;
};

} // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        (void)std::fputs("usage: kesbluetooth-bench-peer BUS-ADDRESS\n", stderr);
        return 2;
    }
    prctl(PR_SET_TIMERSLACK, 1UL);
    Bluetooth::ScopedError error;
    DBusConnection* connection = dbus_connection_open_private(argv[1], error);
    if (!connection || !dbus_bus_register(connection, error) ||
        dbus_bus_request_name(connection, Bench::peerName, 0, error) < 0) {
        (void)std::fprintf(stderr, "%s: %s\n", argv[1], error.message());
        return 1;
    }
    (void)std::puts("ready");
    (void)std::fflush(stdout);
    Peer(connection).serve();
    return 0;
}
