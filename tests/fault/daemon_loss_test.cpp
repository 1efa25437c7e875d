// SPDX-License-Identifier: LGPL-2.1-or-later
// The Bluetooth daemon goes and comes back, over and over, and the bus goes in the middle of a
// scan. What the library does then is used meanwhile by other threads.

#include "fault/soak.h"
#include "support/callbacks.h"
#include "support/running_loop.h"
#include "support/simulation.h"
#include "support/syslog_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>
#include <bluetooth/manager.h>
#include <bluetooth/scanner.h>

#include <atomic>
#include <future>
#include <memory>
#include <thread>

namespace Bluetooth::Test {

namespace {

/// Lists everything, whatever of it is there.
/// @return how many adapters there are; -1 when the daemon is not
long listAll() {
    const std::unique_ptr<Manager> manager(Manager::getManager());
    const std::unique_ptr<AdapterList> adapters(manager ? manager->listAdapters() : nullptr);
    if (!adapters)
        return -1;
    long count = 0;
    for (Adapter* adapter : *adapters) {
        if (adapter) { // null when the daemon went meanwhile
            delete adapter->listDevices();
            ++count;
        }
    }
    return count;
}

/// Asks the scanner service. @return how many devices it has found; -1 without an answer
long scan() {
    Scanner scanner;
    const std::unique_ptr<std::vector<std::pair<std::string, Dict*>>> devices(
        scanner.listDevices("hci0", false));
    if (!devices)
        return -1;
    for (const auto& device : *devices)
        delete device.second;
    return static_cast<long>(devices->size());
}

bool scanUntilFound() {
    return becomesTrue([] { return scan() > 0; }, Milliseconds(10)); // the service tells nobody
}

} // namespace

/// The simulated daemon, a session bus, and the scanner service in its own process.
class DaemonLossTest : public ::testing::Test {
protected:
    void SetUp() override {
        KES_NEEDS_RECEIVE_LOOP();
        ASSERT_TRUE(session.waitForOwner("com.kestrine.bluetooth", true));
    }

    void dropAndRegain(int rounds) {
        for (int round = 0; round < rounds; ++round) {
            simulation.control("DropName");
            ASSERT_FALSE(BluezObject::hasBluetoothd());
            ASSERT_EQ(listAll(), -1);
            simulation.control("RegainName");
            ASSERT_TRUE(BluezObject::hasBluetoothd());
            ASSERT_EQ(listAll(), 2);
            log.take();
        }
    }

    SyslogCapture log;
    Simulation simulation;
    PrivateBus sessionBus{PrivateBus::Kind::Session};
    RawPeer session{sessionBus.address()};
    ChildProcess service{{KESBT_SCANNERD}, ChildProcess::Output::Capture};
};

TEST_F(DaemonLossTest, ListsAndTheScannerSurviveADaemonThatComesAndGoes) {
    std::atomic<bool> done{false};
    const auto repeat = [&done](long (*task)()) {
        while (!done)
            task();
    };
    const auto listing = std::async(std::launch::async, repeat, listAll);
    const auto asking = std::async(std::launch::async, repeat, scan);
    dropAndRegain(20);
    const Holdings before;
    dropAndRegain(soakCount(1'000));
    expectNoGrowth(before);
    // A discovery ends with its daemon, and the service goes on as if it ran: it is told to begin
    // anew.
    Scanner scanner;
    EXPECT_TRUE(scanner.removeFinder("hci0"));
    EXPECT_TRUE(scanUntilFound());
    EXPECT_FALSE(service.hasEnded());
    done = true;
}

TEST_F(DaemonLossTest, TheLossOfTheBusEndsAScanWithErrors) {
    const std::unique_ptr<Manager> manager(Manager::getManager());
    const std::unique_ptr<Adapter> adapter(manager->findAdapter("hci0"));
    ASSERT_TRUE(adapter);
    ASSERT_EQ(adapter->setDeviceFoundHandler(onDict), 0);
    const RunningLoop running(*manager);
    ASSERT_EQ(adapter->startDiscovery(), 0);
    ASSERT_TRUE(seen().waitFor(1));
    ASSERT_TRUE(scanUntilFound());
    log.take();

    simulation.bus().kill();
    EXPECT_EQ(adapter->listDevices(), nullptr);
    EXPECT_NE(adapter->getErrorMessage(), "");
    EXPECT_EQ(adapter->stopDiscovery(), -1);
    EXPECT_FALSE(BluezObject::hasBluetoothd());
    EXPECT_EQ(scan(), -1); // the service is on the other bus
    log.take();
}

} // namespace Bluetooth::Test
