// SPDX-License-Identifier: LGPL-2.1-or-later
// The bus goes away, and comes back.

#include "support/callbacks.h"
#include "support/peer_test.h"

#include <bluetooth/connection.h>

#include <ctime>
#include <memory>
#include <thread>

namespace Bluetooth::Test {

namespace {

/// @return the CPU time that the whole process takes during 300 ms
Milliseconds cpuTimeOfIdling() {
    const auto used = [] {
        timespec time{};
        clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
        return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
    };
    const auto before = used();
    Latch never;
    never.wait(Milliseconds(300));
    return std::chrono::duration_cast<Milliseconds>(used() - before);
}

} // namespace

class BusLossTest : public LoopTest {
protected:
    /// The bus is there again, with a peer that answers Ask.
    void restartBus() {
        bus.start();
        again = std::make_unique<RawPeer>(bus.address(), peerName);
        again->reply("Ask", with("again"));
    }

    std::unique_ptr<RawPeer> again;
};

TEST_F(BusLossTest, CallsInFlightAndLaterOnesFailWithAText) {
    peer.neverReply("Slow");
    const auto killer = std::async(std::launch::async, [&] {
        EXPECT_TRUE(peer.waitForCalls("Slow", 1));
        bus.kill();
    });
    EXPECT_EQ(ask(proxy, "Slow"), "-1 11 Connection was disconnected before a reply was received");
    EXPECT_EQ(ask(proxy, "Slow"), "-1 11 Connection is closed");
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    EXPECT_EQ(outcomeOf(proxy, proxy.sendMessage(false, -1)), "-1 10 Failed to send message");
    EXPECT_EQ(proxy.setSignalHandlerString("Changed", onString), -1);
    EXPECT_EQ(log.take().size(), 1u);
}

TEST_F(BusLossTest, ANewBusIsConnectedToAfterwards) {
    // As libdbus leaves it to a program that connects before the library does.
    dbus_connection_set_exit_on_disconnect(proxy.getConnection(), true);
    bus.kill();
    EXPECT_EQ(Connection::get(busType), nullptr); // and the process goes on
    EXPECT_EQ(log.take(), Texts{"connection.cpp Failed to get bus connection"});
    for (int round = 0; round < 3; ++round) {
        restartBus();
        RemoteObject renewed(peerName, peerPath, peerInterface, busType);
        ASSERT_NE(renewed.getConnection(), nullptr);
        EXPECT_EQ(ask(renewed, "Ask"), "again");
        EXPECT_EQ(call("Ask"), -1); // the old proxy stays with the old bus
        bus.kill();                 // not noticed by anybody before the next proxy
    }
}

TEST_F(BusLossTest, TheLoopNeitherSpinsNorHangsAndSubscriptionsCanBeMadeAnew) {
    auto subscribed = std::make_unique<RemoteObject>(peerName, peerPath, peerInterface, busType);
    ASSERT_EQ(subscribed->setSignalHandlerString("Changed", onString), 0);
    ASSERT_EQ(loop.startLoop(), 0);
    peer.emit(peerPath, peerInterface, "Changed", with("before"));
    ASSERT_TRUE(seen().waitFor(1));
    bus.kill();
    EXPECT_EQ(call("Ask"), -1);
    EXPECT_LT(cpuTimeOfIdling(), Milliseconds(60));

    log.take();
    subscribed.reset();
    const Texts lines = log.take();
    ASSERT_EQ(lines.size(), 1u);
    EXPECT_EQ(lines[0].find("remote_object.cpp Remove match error ("), 0u) << lines[0];

    restartBus();
    RemoteObject renewed(peerName, peerPath, peerInterface, busType);
    ASSERT_EQ(renewed.setSignalHandlerString("Changed", onString), 0);
    {
        const RunningLoop running(renewed); // a thread for the new connection, beside the old one
        again->emit(peerPath, peerInterface, "Changed", with("after"));
        ASSERT_TRUE(seen().waitFor(2));
    }
    EXPECT_EQ(seen().events(),
              (Texts{"string /com/example/peer before", "string /com/example/peer after"}));
    EXPECT_EQ(loop.waitLoop(), 0);
}

TEST_F(BusLossTest, NothingSpinsWithoutALoopEither) {
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    bus.kill();
    std::thread([] {
        RemoteObject object(peerName, peerPath, peerInterface, busType);
        EXPECT_EQ(call(object, "Ask"), -1);
    }).join();
    EXPECT_LT(cpuTimeOfIdling(), Milliseconds(60));
}

} // namespace Bluetooth::Test
