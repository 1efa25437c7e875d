#ifndef KESBLUETOOTH_TESTS_SIMULATION_H
#define KESBLUETOOTH_TESTS_SIMULATION_H

#include "support/private_bus.h"
#include "support/raw_peer.h"

#include <string>
#include <vector>

namespace Bluetooth::Test {

/// The simulated daemon in its own process, on a system bus of the test's own, with its times
/// shortened to a hundredth.
class Simulation {
public:
    using Build = Writer::Build;

    /// Returns once the adapters are there.
    /// @param scenario the text of a scenario file; "" for the built-in scenario
    explicit Simulation(const std::string& scenario = "");

    /// Calls the control interface and waits. A failure fails the test.
    MessagePtr control(const std::string& method, const Build& arguments = {});
    std::future<MessagePtr> startControl(const std::string& method, const Build& arguments = {});
    void emit(const std::string& path, const std::string& interface, const std::string& member,
              const char* signature, const Build& argument);
    void failNext(const char* interface, const char* method, const char* name, const char* text);
    /// Kills the daemon's process.
    void kill() { m_process.kill(); }

    PrivateBus& bus() { return m_bus; }
    /// Another participant, for the test to look with.
    RawPeer& peer() { return m_peer; }

private:
    PrivateBus m_bus{PrivateBus::Kind::System};
    ChildProcess m_process;
    RawPeer m_peer{m_bus.address()};
};

} // namespace Bluetooth::Test

#endif
