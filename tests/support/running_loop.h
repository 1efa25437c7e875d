// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_RUNNING_LOOP_H
#define KESBLUETOOTH_TESTS_RUNNING_LOOP_H

#include <bluetooth/remote_object.h>

#include "core/bus_link.h"

#include <gtest/gtest.h>

namespace Bluetooth::Test {

/// Runs a proxy's receive thread. No other can run in this process afterwards: a fixture whose
/// tests use one begins with KES_NEEDS_RECEIVE_LOOP().
class RunningLoop {
public:
    explicit RunningLoop(RemoteObject& proxy) : m_proxy(proxy) {
        EXPECT_EQ(m_proxy.startLoop(), 0);
    }
    ~RunningLoop() {
        m_proxy.stopLoop();
        m_proxy.waitLoop();
    }
    RunningLoop(const RunningLoop&) = delete;
    RunningLoop& operator=(const RunningLoop&) = delete;

private:
    RemoteObject& m_proxy;
};

} // namespace Bluetooth::Test

/// Skips a test that can no longer run; ctest gives each test a process of its own.
#define KES_NEEDS_RECEIVE_LOOP()                                                                   \
    if (::Bluetooth::BusLink::isStopRequested())                                                   \
    GTEST_SKIP() << "a test before this one has stopped the receive threads of this process"

#endif
