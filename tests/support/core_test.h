#ifndef KESBLUETOOTH_TESTS_CORE_TEST_H
#define KESBLUETOOTH_TESTS_CORE_TEST_H

#include "support/private_bus.h"
#include "support/raw_peer.h"
#include "support/syslog_capture.h"

#include <bluetooth/remote_object.h>

#include <gtest/gtest.h>

namespace Bluetooth::Test {

inline constexpr const char* peerName = "com.example.Peer";
inline constexpr const char* peerPath = "/com/example/peer";
inline constexpr const char* peerInterface = "com.example.Peer";

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

    SyslogCapture log;
    PrivateBus bus{PrivateBus::Kind::Session};
    RawPeer peer{bus.address(), peerName};
    RemoteObject proxy{peerName, peerPath, peerInterface, busType};
};

} // namespace Bluetooth::Test

#endif
