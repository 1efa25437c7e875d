#ifndef KESBLUETOOTH_TESTS_SCANNER_TEST_H
#define KESBLUETOOTH_TESTS_SCANNER_TEST_H

#include "support/private_bus.h"
#include "support/raw_peer.h"
#include "support/simulation.h"
#include "support/syslog_capture.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Test {

inline constexpr const char* serviceName = "com.kestrine.bluetooth";
inline constexpr const char* serviceInterface = "com.kestrine.bluetooth.Scanner";

inline constexpr const char* mouse = "00:11:22:33:44:01"; // paired with hci0
inline constexpr const char* phone = "00:11:22:33:44:02";
inline constexpr const char* speaker = "00:11:22:33:44:03"; // in reach of hci1 only

/// An answer that tells of no device, as argumentsOf() writes it.
inline constexpr const char* emptyAnswer = "a(e(s: s:))";

/// The simulated daemon and a session bus, for a scanner service. Discovery goes in rounds of 0.1
/// s.
class ScannerTest : public ::testing::Test {
protected:
    ScannerTest();

    /// Changes, or with "AddDevice" adds, a device.
    template <class Value>
    void setDevice(const char* address, const char* key, Value value,
                   const char* method = "SetDevice") {
        simulation.control(method, [&](Writer& w) {
            w(address).dict("sv", [&](Writer& e) { e.entry(key, Var{value}); });
        });
    }

    void comeInReach(const char* address) { setDevice(address, "Present", true); }

    /// How often the daemon has been called so far.
    std::size_t countCalls(const char* adapter, const char* member);
    bool awaitCalls(const char* adapter, const char* member, std::size_t count);
    /// @return the unique name of the one who called the daemon last
    std::string lastCaller();

    /// Calls the service and awaits its answer.
    /// @return its arguments as text; for an error its text after "ERROR "
    std::string call(const char* method, const char* adapterId);
    std::string ask(const char* adapterId) { return call("ListDevices", adapterId); }
    /// Asks until the answer is as wanted: the service tells nobody when it has found something.
    /// @return the last answer
    std::string askUntil(const char* adapterId,
                         const std::function<bool(const std::string&)>& wanted);
    std::string askUntilListed(const char* adapterId, const char* address);
    std::string askUntilGone(const char* adapterId, const char* address);

    SyslogCapture log;
    Simulation simulation;
    RawPeer& system = simulation.peer();
    PrivateBus sessionBus{PrivateBus::Kind::Session, SESSION_BUS_CONFIGURATION};
    RawPeer session{sessionBus.address()};
};

inline bool lists(const std::string& answer, const char* address) {
    return answer.find(std::string("s:") + address) != std::string::npos;
}

} // namespace Bluetooth::Test

#endif
