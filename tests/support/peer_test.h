// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_PEER_TEST_H
#define KESBLUETOOTH_TESTS_PEER_TEST_H

#include "support/private_bus.h"
#include "support/raw_peer.h"
#include "support/running_loop.h"
#include "support/syslog_capture.h"

#include <gtest/gtest.h>

namespace Bluetooth::Test {

inline constexpr const char* peerName = "com.example.Peer";
inline constexpr const char* peerPath = "/com/example/peer";
inline constexpr const char* peerInterface = "com.example.Peer";

inline constexpr const char* adapterPath = "/org/bluez/42/hci0";
inline constexpr const char* devicePath = "/org/bluez/42/hci0/dev_00_11_22_33_44_55";
inline constexpr const char* address = "00:11:22:33:44:55";

/// What an object of this process does when it is asked; its answer goes back.
inline std::function<std::string()>& onRequest() {
    static std::function<std::string()> action;
    return action;
}

/// Registers the object. It is asked on the thread that dispatches the connection.
inline void serveObject(DBusConnection* connection) {
    static const DBusObjectPathVTable handlers = [] {
        DBusObjectPathVTable table{};
        table.message_function = [](DBusConnection* bus, DBusMessage* request, void*) {
            const MessagePtr reply = replyTo(request, with(onRequest()()));
            dbus_connection_send(bus, reply.get(), nullptr);
            return DBUS_HANDLER_RESULT_HANDLED;
        };
        return table;
    }();
    ASSERT_TRUE(dbus_connection_register_object_path(connection, "/object", &handlers, nullptr));
}

inline MessagePtr requestTo(const char* process) {
    return MessagePtr(dbus_message_new_method_call(process, "/object", "com.example.Object", "Do"));
}

/// A session bus with a peer on it, and a proxy of the peer.
class CoreTest : public ::testing::Test {
protected:
    static constexpr DBusBusType busType = DBUS_BUS_SESSION;

    /// @return the result of calling a method of the peer and waiting for the reply
    int call(const char* method, int timeoutMs = -1) { return call(proxy, method, timeoutMs); }
    static int call(RemoteObject& object, const char* method, int timeoutMs = -1) {
        const int result = object.newMessage(method);
        return result == 0 ? object.sendMessage(true, timeoutMs) : result;
    }
    /// @return "RESULT NUMBER TEXT" of what an operation returned and recorded; "0 0 " for success.
    ///         The error is forgotten
    static std::string outcomeOf(RemoteObject& object, int result) {
        std::string outcome = std::to_string(result) + ' ' +
                              std::to_string(object.getErrorNumber()) + ' ' +
                              object.getErrorMessage();
        object.resetError();
        return outcome;
    }
    /// @return the text that a method is answered with, or outcomeOf() what came instead
    static std::string ask(RemoteObject& object, const char* method) {
        std::string text;
        const int result = call(object, method) == 0 ? object.getReplyValue(text) : -1;
        return result == 0 ? text : outcomeOf(object, result);
    }

    SyslogCapture log;
    PrivateBus bus{PrivateBus::Kind::Session};
    RawPeer peer{bus.address(), peerName};
    RemoteObject proxy{peerName, peerPath, peerInterface, busType};
};

/// The same for tests that run a receive thread, which `loop` is for.
class LoopTest : public CoreTest {
protected:
    void SetUp() override {
        KES_NEEDS_RECEIVE_LOOP();
        seen().clear();
    }

    RemoteObject loop{peerName, "/loop", "com.example.Loop", busType};
};

/// A system bus where a peer stands in for the daemon and answers as a test says, badly too.
class DaemonTest : public ::testing::Test {
protected:
    /// What the daemon was asked, forgotten by this.
    Texts takeCalls() {
        Texts texts = daemon.callTexts();
        daemon.forgetCalls();
        return texts;
    }

    SyslogCapture log;
    PrivateBus bus{PrivateBus::Kind::System};
    RawPeer daemon{bus.address(), "org.bluez"};
};

} // namespace Bluetooth::Test

#endif
