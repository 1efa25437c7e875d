// SPDX-License-Identifier: LGPL-2.1-or-later
// Who is heard when the program wants signals from its services only.

#include "support/callbacks.h"
#include "support/peer_test.h"

#include <bluetooth/connection.h>

#include <algorithm>
#include <memory>

namespace Bluetooth::Test {

/// libdbus looks up the addresses of both buses when the first is used.
struct KnowsOtherBus {
    std::string otherAddress = PrivateBus::address(PrivateBus::Kind::System);
};

class SenderCheckTest : public KnowsOtherBus, public LoopTest {
protected:
    SenderCheckTest() {
        Connection::checkSenders(true);
        monitor.becomeMonitor();
    }
    ~SenderCheckTest() override { Connection::checkSenders(false); }

    /// Emits a signal to all, or to one, and returns when the bus has passed it on.
    static void say(RawPeer& from, const char* text, const char* to = nullptr) {
        MessagePtr signal(dbus_message_new_signal(peerPath, peerInterface, "Changed"));
        Writer(signal.get(), with(text));
        dbus_message_set_destination(signal.get(), to);
        from.send(std::move(signal));
        from.hasOwner(peerName);
    }

    static std::string uniqueName(RawPeer& of) {
        std::string name;
        of.run([&](DBusConnection* connection) { name = dbus_bus_get_unique_name(connection); });
        return name;
    }

    /// @return how often the bus has been asked who owns a name
    long questions() {
        RemoteObject driver(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, busType);
        EXPECT_EQ(call(driver, "GetId"), 0);
        EXPECT_TRUE(monitor.waitForCalls("GetId", ++rounds));
        const auto calls = monitor.calls();
        return std::count_if(calls.begin(), calls.end(), [](const SeenCall& seenCall) {
            return seenCall.member == "GetNameOwner";
        });
    }

    static bool isHeard(const std::string& event) {
        return seen().waitUntil([&](const Texts& events) {
            return std::find(events.begin(), events.end(), event) != events.end();
        });
    }

    RawPeer monitor{bus.address()};
    RawPeer stranger{bus.address()};
    std::size_t rounds = 0;
};

TEST_F(SenderCheckTest, OnlyTheServiceAndTheBusAreHeardHoweverASignalComes) {
    RemoteObject ofStranger(uniqueName(stranger).c_str(), "/stranger", peerInterface, busType);
    RemoteObject ofBus("com.example.Nobody", DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, busType);
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    ASSERT_EQ(ofStranger.setSignalHandlerString("Changed", onString), 0);
    const RunningLoop running(loop);
    const auto begin = std::chrono::steady_clock::now();
    for (int i = 0; i < 20; ++i) {
        say(stranger, "forged");
        say(stranger, "forged", proxy.getConnectionName());
    }
    say(peer, "real");
    say(peer, "real", proxy.getConnectionName());
    ASSERT_EQ(ofBus.setSignalHandlerString("NameOwnerChanged", onString), 0);
    ASSERT_TRUE(stranger.own("com.example.New"));
    ASSERT_TRUE(isHeard("string /org/freedesktop/DBus com.example.New"));
    Texts expected(40, "string /stranger forged");
    expected.insert(expected.end(), 2, "string /com/example/peer real");
    expected.emplace_back("string /org/freedesktop/DBus com.example.New");
    EXPECT_EQ(seen().events(), expected);
    const auto took = std::chrono::steady_clock::now() - begin;
    EXPECT_GE(questions(), 3) << "for each name that was subscribed to, and for the stranger";
    EXPECT_LE(questions(), 3 + took / std::chrono::seconds(1)) << "who is asked about again then";

    Connection::checkSenders(false); // as it was at first
    say(stranger, "forged");
    EXPECT_TRUE(isHeard("string /com/example/peer forged"));
}

TEST_F(SenderCheckTest, ANewOwnerOfTheNameIsHeardAndTheOldOneIsNot) {
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    const RunningLoop running(loop);
    say(peer, "old");
    peer.disown(peerName);
    RawPeer restarted(bus.address(), peerName);
    say(restarted, "new");
    ASSERT_TRUE(isHeard("string /com/example/peer new"));
    say(peer, "too late");
    ASSERT_TRUE(monitor.waitForCalls("GetNameOwner", 3)); // at first, for the new one, for this
    restarted.disown(peerName);
    say(stranger, "too early");
    ASSERT_TRUE(monitor.waitForCalls("GetNameOwner", 4));
    ASSERT_TRUE(stranger.own(peerName));
    const auto events = [] {
        Texts texts = seen().events();
        texts.erase(std::unique(texts.begin(), texts.end()), texts.end());
        return texts;
    };
    EXPECT_TRUE(becomesTrue(
        [&] {
            say(stranger, "newest");
            return events().back() != "string /com/example/peer new";
        },
        Milliseconds(20)));
    EXPECT_EQ(events(), (Texts{"string /com/example/peer old", "string /com/example/peer new",
                               "string /com/example/peer newest"}));
}

TEST_F(SenderCheckTest, StrangersInEverNewNamesNeitherCostNorHideMuch) {
    static Latch entered, leave;
    ASSERT_EQ(proxy.setSignalHandlerString("Hold",
                                           [](RemoteObject*, const char*) {
                                               entered.open();
                                               leave.wait();
                                           }),
              0);
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    const RunningLoop running(loop);
    peer.emit(peerPath, peerInterface, "Hold", with("x"));
    ASSERT_TRUE(entered.wait());
    const auto crowd = [this] {
        for (int i = 0; i < 50; ++i) {
            RawPeer other(bus.address());
            say(other, "forged");
        }
    };
    crowd();
    say(peer, "last");
    peer.disown(peerName);
    RawPeer restarted(bus.address(), peerName);
    say(restarted, "first");
    crowd();
    leave.open();
    say(restarted, "second");
    EXPECT_TRUE(isHeard("string /com/example/peer second"));
    EXPECT_EQ(questions(), 2) << "at the subscription, and one for all that had come";

    const auto begin = std::chrono::steady_clock::now();
    crowd();
    say(restarted, "third");
    EXPECT_TRUE(isHeard("string /com/example/peer third"));
    const auto took = std::chrono::steady_clock::now() - begin;
    EXPECT_LE(questions(), 2 + 1 + took / Milliseconds(10));
    EXPECT_EQ(seen().events(),
              (Texts{"string /com/example/peer last", "string /com/example/peer first",
                     "string /com/example/peer second", "string /com/example/peer third"}));
}

TEST_F(SenderCheckTest, AnotherBusSaysNothingAboutThisOnesNames) {
    PrivateBus other(PrivateBus::Kind::System);
    RawPeer twin(other.address());
    ASSERT_EQ(uniqueName(twin), uniqueName(peer));
    ASSERT_TRUE(twin.own(peerName));
    RemoteObject otherLoop(peerName, "/loop", peerInterface, DBUS_BUS_SYSTEM);
    ASSERT_EQ(otherLoop.setSignalHandlerString("Changed", onString), 0);
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    const RunningLoop running(loop);
    const RunningLoop runningToo(otherLoop);
    say(twin, "of the other bus", otherLoop.getConnectionName());
    say(peer, "of this bus");
    ASSERT_TRUE(seen().waitFor(2));
    Texts events = seen().events();
    std::sort(events.begin(), events.end());
    EXPECT_EQ(events,
              (Texts{"string /com/example/peer of this bus", "string /loop of the other bus"}));
}

} // namespace Bluetooth::Test
