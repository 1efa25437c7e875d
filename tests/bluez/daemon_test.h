#ifndef KESBLUETOOTH_TESTS_DAEMON_TEST_H
#define KESBLUETOOTH_TESTS_DAEMON_TEST_H

#include "support/private_bus.h"
#include "support/raw_peer.h"
#include "support/syslog_capture.h"

#include <gtest/gtest.h>

namespace Bluetooth::Test {

using Texts = std::vector<std::string>;

inline constexpr const char* adapterPath = "/org/bluez/42/hci0";
inline constexpr const char* devicePath = "/org/bluez/42/hci0/dev_00_11_22_33_44_55";
inline constexpr const char* address = "00:11:22:33:44:55";

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
