// SPDX-License-Identifier: LGPL-2.1-or-later
#include "bus.h"

#include "processor_time.h"

#include <stdexcept>

namespace Bench {

namespace {
// dispatch is measured with more subscriptions, and a presence check with more names, than a bus
// allows as it comes
constexpr const char* limits = "<limit name=\"max_match_rules_per_connection\">100000</limit>"
                               "<limit name=\"max_names_per_connection\">100000</limit>";
} // namespace

Bus::Bus()
    : m_bus(Bluetooth::Test::PrivateBus::Kind::System, limits),
      m_peer({KES_BENCH_PEER, m_bus.address()}, Bluetooth::Test::ChildProcess::Output::Capture) {
    if (m_peer.readLine() != "ready")
        throw std::runtime_error("the peer does not start: " + m_peer.readErrors());
}

double Bus::processorSeconds() const {
    return Bench::processorSeconds(m_bus.pid());
}

} // namespace Bench
