// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BENCH_BUS_H
#define KESBLUETOOTH_BENCH_BUS_H

#include "support/private_bus.h"

namespace Bench {

/// A private system bus with the peer on it; both end with the benchmark.
class Bus {
public:
    Bus();
    /// The processor time, in seconds, that the bus daemon has used so far.
    double processorSeconds() const;

private:
    Bluetooth::Test::PrivateBus m_bus;
    Bluetooth::Test::ChildProcess m_peer;
};

} // namespace Bench

#endif
