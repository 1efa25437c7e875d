// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_KESBT_TEST_H
#define KESBLUETOOTH_TESTS_KESBT_TEST_H

#include "support/devices.h"
#include "support/namespace_test.h"
#include "support/simulation.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <memory>
#include <string>

namespace Bluetooth::Test {

using Json = nlohmann::ordered_json;

inline constexpr const char* absentDaemon =
    "bluetoothd is not running on the system bus; start it, or try: bluez4-sim -- kesbt adapters\n";

using namespace std::string_literals;

/// Starts the program with its output captured.
/// @param arguments  with a blank between each two
std::unique_ptr<ChildProcess> start(const std::string& arguments,
                                    ChildProcess::Output output = ChildProcess::Output::Capture);
/// The same where somebody can be asked.
inline std::unique_ptr<ChildProcess> startAtTerminal(const std::string& arguments) {
    return start(arguments, ChildProcess::Output::Terminal);
}
/// Runs it to its end.
Result run(const std::string& arguments);
/// Runs it with --json. @return the document that it prints
Json json(const std::string& arguments);
/// Runs something else: a command of the shell.
Result runShell(const std::string& command);

/// Runs the program, which must fail with this status, one line on standard error and nothing on
/// standard output. @return the line
std::string failure(const std::string& arguments, int status = 1);
/// Waits for the end of a started one, with this status. @return what it wrote to standard error
std::string errorsOf(ChildProcess& program, int status = 1);

/// The next event of a stream for which `member` is `value`.
Json awaitEvent(ChildProcess& program, const std::string& member, const Json& value);

/// The simulated daemon with its built-in scenario, on a bus of the test's own.
class SimulatedDaemon {
protected:
    SimulatedDaemon() { simulation.watchCalls(); }

    void setTimeScale(double scale) { simulation.control("SetTimeScale", with(scale)); }
    /// Waits until the daemon has received that many calls of a method.
    void awaitCall(const std::string& member, std::size_t count = 1) {
        EXPECT_TRUE(simulation.awaitCalls("s:" + member + " ", count)) << "no call of " << member;
    }
    std::size_t calls(const std::string& member) {
        return simulation.countCalls("s:" + member + " ");
    }
    static Json adapterProperties() { return json("adapter")["properties"]; }

    Simulation simulation;
};
class KesbtTest : public testing::Test, protected SimulatedDaemon {};
/// For the verbs that use the machine's fixed paths.
class HostTest : public NamespaceTest, protected SimulatedDaemon {};

} // namespace Bluetooth::Test

#endif
