// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_SIMULATION_H
#define KESBLUETOOTH_TESTS_SIMULATION_H

#include "support/private_bus.h"
#include "support/raw_peer.h"

#include <string>

namespace Bluetooth::Test {

/// The simulated daemon in its own process, on a system bus of the test's own, with its times
/// shortened to a hundredth.
class Simulation {
public:
    using Build = Writer::Build;

    /// Returns once the adapters are there.
    /// @param scenario the text of a scenario file; "" for the built-in scenario
    explicit Simulation(const std::string& scenario = "");
    /// Ends the daemon as it is asked.
    ~Simulation();
    Simulation(const Simulation&) = delete;
    Simulation& operator=(const Simulation&) = delete;

    /// Calls the control interface and waits. A failure fails the test.
    MessagePtr control(const std::string& method, const Build& arguments = {});
    /// Changes, or with "AddDevice" adds, a device.
    template <class Value>
    void setDevice(const char* device, const char* key, const Value& value,
                   const char* method = "SetDevice") {
        control(method, [&](Writer& w) {
            w(device).dict("sv", [&](Writer& e) { e.entry(key, Var{value}); });
        });
    }
    void failNext(const char* interface, const char* method, const char* name, const char* text);
    void delayNext(const char* interface, const char* method, std::uint32_t milliseconds);

    /// From now on it is seen what the daemon is asked.
    void watchCalls() { m_peer.addMatch("type='signal',member='CallReceived'"); }
    /// How often the daemon has been asked so far.
    /// @param what part of the call's "o:PATH s:INTERFACE s:METHOD s:CALLER "
    std::size_t countCalls(const std::string& what);
    bool awaitCalls(const std::string& what, std::size_t count = 1);
    /// The calls so far, as awaitCalls() sees them.
    Texts calls();

    ChildProcess& process() { return m_process; }
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
