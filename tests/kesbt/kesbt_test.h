#ifndef KESBLUETOOTH_TESTS_KESBT_TEST_H
#define KESBLUETOOTH_TESTS_KESBT_TEST_H

#include "support/child_process.h"
#include "support/private_bus.h"
#include "support/raw_peer.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Test {

using Json = nlohmann::ordered_json;
using Arguments = std::vector<std::string>;

inline constexpr const char* headset = "00:11:22:33:44:01";
inline constexpr const char* keyboard = "00:11:22:33:44:02";
inline constexpr const char* phone = "00:11:22:33:44:03";
inline constexpr const char* gps = "00:11:22:33:44:04";     // PIN 1234
inline constexpr const char* speaker = "00:11:22:33:44:05"; // vanishes
inline constexpr const char* mouse = "00:11:22:33:44:06";   // known to hci0
inline constexpr const char* laptop = "00:11:22:33:44:07";  // seen, does not answer
inline constexpr const char* absentDaemon =
    "bluetoothd is not running on the system bus; start it, or try: bluez4-sim -- kesbt adapters\n";

/// What a run of the program left behind.
struct Result {
    int status;
    std::string out;
    std::string err;

    Json json() const { return Json::parse(out); }
    bool operator==(const Result& other) const {
        return status == other.status && out == other.out && err == other.err;
    }
};
std::ostream& operator<<(std::ostream& stream, const Result& result);

/// Starts the program with its output captured.
std::unique_ptr<ChildProcess> start(const Arguments& arguments);
/// Runs it to its end.
Result run(const Arguments& arguments);
/// Waits for the end of a started one.
Result finish(ChildProcess& program);
/// Runs something else.
Result runCommand(const Arguments& command);

/// Runs the program, which must fail with this status, one line on standard error and nothing on
/// standard output. @return the line
std::string failure(const Arguments& arguments, int status = 1);

/// The next event of a stream for which `member` is `value`.
Json awaitEvent(ChildProcess& program, const std::string& member, const Json& value);

/// The simulated daemon with its built-in scenario, on a bus of the test's own.
class KesbtTest : public testing::Test {
protected:
    /// @param timeScale of the simulation
    explicit KesbtTest(const std::string& timeScale = "0.05");

    /// Calls the simulation's control interface.
    MessagePtr control(const char* method, const RawPeer::Build& arguments = {});
    void setTimeScale(double scale);
    /// Waits until the daemon has received that many calls of a method.
    void awaitCall(const std::string& member, std::size_t count = 1);
    std::size_t calls(const std::string& member);
    Json adapterProperties() const { return run({"adapter", "--json"}).json()["properties"]; }

    PrivateBus bus{PrivateBus::Kind::System};
    std::unique_ptr<ChildProcess> daemon;
    std::unique_ptr<RawPeer> peer;
};

/// The same for the verbs that use the machine's fixed paths: ctest runs it in a namespace.
class HostTest : public KesbtTest {
protected:
    HostTest();
};

} // namespace Bluetooth::Test

#endif
