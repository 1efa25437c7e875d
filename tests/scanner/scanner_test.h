// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_SCANNER_TEST_H
#define KESBLUETOOTH_TESTS_SCANNER_TEST_H

#include "support/devices.h"
#include "support/private_bus.h"
#include "support/raw_peer.h"
#include "support/simulation.h"
#include "support/syslog_capture.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>

namespace Bluetooth::Test {

inline constexpr const char* serviceName = "com.kestrine.bluetooth";
inline constexpr const char* serviceInterface = "com.kestrine.bluetooth.Scanner";

/// An answer that tells of no device, as argumentsOf() writes it.
inline constexpr const char* emptyAnswer = "a(e(s: s:))";

inline bool lists(const std::string& answer, const char* address) {
    return answer.find(std::string("s:") + address) != std::string::npos;
}

/// The simulated daemon and a session bus, for a scanner service. Discovery goes in rounds of
/// 0.1 s.
class ScannerTest : public ::testing::Test {
protected:
    ScannerTest() { simulation.watchCalls(); }

    void comeInReach(const char* address) { simulation.setDevice(address, "Present", true); }

    /// How often the daemon has been told so far to start or stop a discovery.
    std::size_t starts(const char* adapter) { return simulation.countCalls(on(adapter, "Start")); }
    std::size_t stops(const char* adapter) { return simulation.countCalls(on(adapter, "Stop")); }
    bool awaitStarts(const char* adapter, std::size_t count) {
        return simulation.awaitCalls(on(adapter, "Start"), count);
    }
    static std::string on(const char* adapter, const char* what) {
        return std::string("/") + adapter + " s:org.bluez.Adapter s:" + what + "Discovery ";
    }
    /// @return the path of an adapter
    std::string pathOf(const char* adapter) {
        const MessagePtr reply =
            system.call("org.bluez", "/", "org.bluez.Manager", "FindAdapter", with(adapter)).get();
        return argumentsOf(reply.get()).substr(std::string("o:").size());
    }

    /// Calls the service and awaits its answer.
    /// @return its arguments as text; for an error its text after "ERROR "
    std::string call(const char* method, const char* adapterId) {
        const MessagePtr reply =
            session.call(serviceName, "/", serviceInterface, method, with(adapterId)).get();
        if (!reply)
            return "ERROR no reply";
        const std::string arguments = argumentsOf(reply.get());
        return dbus_message_get_type(reply.get()) == DBUS_MESSAGE_TYPE_ERROR
                   ? "ERROR " + arguments.substr(std::string("s:").size())
                   : arguments;
    }
    std::string ask(const char* adapterId) { return call("ListDevices", adapterId); }
    /// Asks until a device is listed, or gone: the service tells nobody when it has found
    /// something.
    /// @return the last answer
    std::string askUntilListed(const char* adapterId, const char* address, bool listed = true) {
        std::string answer;
        const auto isAsWanted = [&] {
            answer = ask(adapterId);
            return lists(answer, address) == listed;
        };
        EXPECT_TRUE(becomesTrue(isAsWanted, Milliseconds(10))) << address << ": " << answer;
        return answer;
    }

    SyslogCapture log;
    Simulation simulation{
        // Nothing is in reach until a test says so.
        "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\n[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\n"
        "[Device 00:11:22:33:44:06]\nName=Mouse\nAdapter=hci0\nBehaviour=AlreadyPaired\n"
        "Present=false\n"
        "[Device 00:11:22:33:44:03]\nName=Phone\nClass=360\nRSSI=-60\nPresent=false\n"
        "[Device 00:11:22:33:44:66]\nName=Speaker\nAdapter=hci1\nPresent=false\n"};
    RawPeer& system = simulation.peer();
    // As sessions have it, it carries messages that the system bus does not.
    PrivateBus sessionBus{PrivateBus::Kind::Session, SESSION_BUS_CONFIGURATION
                          "<limit name=\"max_message_size\">100000000</limit>"};
    RawPeer session{sessionBus.address()};
};

} // namespace Bluetooth::Test

#endif
