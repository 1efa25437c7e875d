// SPDX-License-Identifier: LGPL-2.1-or-later
// Subscriptions: who is told of which signal, in which order, and what bad signals do.

#include "core/message_text.h"
#include "support/callbacks.h"
#include "support/peer_test.h"

#include <atomic>
#include <cerrno>
#include <map>
#include <memory>
#include <thread>
#include <tuple>

namespace Bluetooth::Test {

namespace {

std::string rule(const char* member, const char* path) {
    return std::string("s:type='signal',interface='com.example.Peer',member='") + member +
           "',path='" + path + "'";
}

} // namespace

class SignalTest : public LoopTest {
protected:
    /// @param arguments as signalWith() takes them
    void emit(const char* member, const char* arguments, const char* path = peerPath) {
        peer.send(signalWith(path, peerInterface, member, arguments));
    }

    static void subscribeAll(RemoteObject& object, const char* member) {
        ASSERT_EQ(object.setSignalHandlerNoArgument(member, onNothing), 0);
        ASSERT_EQ(object.setSignalHandlerStringDict(member, onDict), 0);
        ASSERT_EQ(object.setSignalHandlerString(member, onString), 0);
        ASSERT_EQ(object.setSignalHandlerStringVariant(member, onVariant), 0);
        ASSERT_EQ(object.setSignalHandlerObjectPath(member, onPath), 0);
    }

    /// Offers a signal to all dispatchers as the receive thread of `loop` does.
    void dispatch(const MessagePtr& signal) {
        DBusMessage* const message = signal.get();
        loop.signalHandlerDispatcherObjectPath(message);
        loop.signalHandlerDispatcherStringVariant(message);
        loop.signalHandlerDispatcherString(message);
        loop.signalHandlerDispatcherStringDict(message);
        loop.signalHandlerDispatcherNoArgument(message);
    }

    /// Waits until the receive thread has delivered everything emitted so far.
    void settle() {
        static Recorder<int> done;
        done.clear();
        RemoteObject marker(peerName, "/marker", "com.example.Marker", busType);
        marker.setSignalHandlerNoArgument("Done", [](RemoteObject*) { done.add(1); });
        peer.emit("/marker", "com.example.Marker", "Done");
        EXPECT_TRUE(done.waitFor(1));
    }
};

TEST_F(SignalTest, EachKindGetsItsArgumentsInAFixedOrderOfTheKinds) {
    subscribeAll(proxy, "Changed");
    ASSERT_EQ(proxy.setSignalHandlerNoArgument("Other", onNothing), 0);
    const RunningLoop running(loop);
    // Without arguments it is, on purpose, the proxy that runs the loop.
    emit("Changed", "('RSSI', <int16 -60>)");
    emit("Changed", "('State', 'bare')");
    emit("Changed", "('00:11', {'Name': <'x'>, 'Class': <uint32 5>, '': <1.5>, 'Never': <true>})");
    emit("Changed", "(objectpath '/new',)");
    settle();
    EXPECT_EQ(
        seen().events(),
        (Texts{"variant /com/example/peer RSSI=-60", "string /com/example/peer RSSI",
               "nothing /loop", "variant /com/example/peer State=bare",
               "string /com/example/peer State", "nothing /loop", "string /com/example/peer 00:11",
               "dict /com/example/peer 00:11 Name: x;Class: 5;", "nothing /loop",
               "path /com/example/peer /new", "nothing /loop"}));
    const std::string noPath = "remote_object.cpp Argument is not object path";
    const std::string noDict = "remote_object.cpp Argument is not dict";
    const std::string noString = "remote_object.cpp Argument is not string";
    const std::string noVariant = "remote_object.cpp Failed to parse variant in signal";
    EXPECT_EQ(log.take(), (Texts{noPath, noDict, noPath, noDict, noPath, noVariant, noString,
                                 noString, noString}));
}

TEST_F(SignalTest, EverySubscribedProxyOfTheInterfaceIsToldTheLatestSubscriberFirst) {
    RemoteObject other(peerName, "/other", peerInterface, busType);
    RemoteObject stranger(peerName, peerPath, "com.example.Other", busType);
    for (RemoteObject* object : {&proxy, &other, &stranger})
        ASSERT_EQ(object->setSignalHandlerString("Changed", onString), 0);
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0); // once more: fires twice
    const RunningLoop running(loop);
    emit("Changed", "('a',)");
    emit("Changed", "('b',)", "/nobody"); // no rule: the bus does not send it
    emit("Changed", "('c',)", "/other");
    settle();
    EXPECT_EQ(seen().events(), (Texts{"string /com/example/peer a", "string /other a",
                                      "string /com/example/peer a", "string /com/example/peer c",
                                      "string /other c", "string /com/example/peer c"}));
}

TEST_F(SignalTest, ABadSignalIsLoggedOnceAndSkippedByItsKindOnly) {
    RemoteObject other(peerName, "/other", peerInterface, busType);
    for (RemoteObject* object : {&proxy, &other})
        ASSERT_EQ(object->setSignalHandlerNoArgument("Changed", onNothing), 0);
    using Subscribe = std::function<int(RemoteObject&)>;
    const auto by = [](auto setter, auto callback) -> Subscribe {
        return [=](RemoteObject& object) { return (object.*setter)("Changed", callback); };
    };
    const Subscribe byString = by(&RemoteObject::setSignalHandlerString, onString);
    const Subscribe byPath = by(&RemoteObject::setSignalHandlerObjectPath, onPath);
    const Subscribe byVariant = by(&RemoteObject::setSignalHandlerStringVariant, onVariant);
    const Subscribe byDict = by(&RemoteObject::setSignalHandlerStringDict, onDict);
    constexpr int decodingError = 4;
    const std::tuple<Subscribe, const char*, const char*, int> cases[] = {
        {byString, "()", "Signal has no arguments", 0},
        {byPath, "()", "Signal has no arguments", 0},
        {byVariant, "()", "Signal has no arguments", 0},
        {byDict, "()", "Signal has no arguments", 0},
        {byString, "(objectpath '/',)", "Argument is not string", 0},
        {byVariant, "(uint32 1, <uint32 1>)", "Argument is not string", 0},
        {byDict, "(@a{sv} {},)", "Argument is not string", 0},
        {byPath, "('/',)", "Argument is not object path", 0},
        {byVariant, "('a',)", "Failed to parse variant in signal", decodingError},
        {byVariant, "('a', <int32 1>)", "Failed to parse variant in signal", decodingError},
        {byDict, "('a',)", "Argument is not dict", 0},
        {byDict, "('a', @as [])", "Argument is not dict", 0},
        {byDict, "('a', {objectpath '/': <true>})", "Failed to parse entry name", decodingError},
        {byDict, "('a', {'a': <1.5>})", "Failed to parse entry value", decodingError},
    };
    for (const auto& [subscribe, arguments, line, error] : cases) {
        seen().clear();
        loop.resetError();
        RemoteObject first(peerName, "/first", peerInterface, busType);
        RemoteObject second(peerName, "/second", peerInterface, busType);
        ASSERT_EQ(subscribe(second), 0);
        ASSERT_EQ(subscribe(first), 0);
        dispatch(signalWith(peerPath, peerInterface, "Changed", arguments));
        EXPECT_EQ(log.take(), Texts{std::string("remote_object.cpp ") + line});
        EXPECT_EQ(seen().events(), (Texts{"nothing /loop", "nothing /loop"}));
        // It is the loop's proxy that remembers a decoding error, not the subscriber.
        EXPECT_EQ(loop.getErrorNumber(), error) << line;
        EXPECT_FALSE(first.hasError());
    }
}

TEST_F(SignalTest, AProxysSubscriptionsEndWithItAndNoOthers) {
    RawPeer monitor(bus.address());
    monitor.becomeMonitor();
    auto leaving = std::make_unique<RemoteObject>(peerName, "/leaving", peerInterface, busType);
    for (RemoteObject* object : {leaving.get(), &proxy})
        subscribeAll(*object, "A");
    ASSERT_EQ(leaving->setSignalHandlerNoArgument("B", onNothing), 0);
    leaving.reset();
    ASSERT_TRUE(monitor.waitForCalls("RemoveMatch", 6));
    std::map<std::string, int> changes;
    for (const SeenCall& change : monitor.calls())
        ++changes[change.text()];
    EXPECT_EQ(changes, (std::map<std::string, int>{{"AddMatch " + rule("A", "/leaving"), 5},
                                                   {"AddMatch " + rule("A", peerPath), 5},
                                                   {"AddMatch " + rule("B", "/leaving"), 1},
                                                   {"RemoveMatch " + rule("A", "/leaving"), 5},
                                                   {"RemoveMatch " + rule("B", "/leaving"), 1}}));

    const MessagePtr text = signalWith(peerPath, peerInterface, "A", "('x',)");
    loop.signalHandlerDispatcherString(text.get());
    loop.signalHandlerDispatcherNoArgument(text.get());
    dispatch(MessagePtr(dbus_message_new_method_call(peerName, peerPath, peerInterface, "A")));
    dispatch(signalWith(peerPath, "com.example.X", "A", "()"));
    dispatch(nullptr);
    EXPECT_EQ(seen().events(), (Texts{"string /com/example/peer x", "nothing /loop"}));
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(SignalTest, ARefusedSubscriptionIsLoggedAndNotRegistered) {
    const std::tuple<const char*, const char*, const char*> cases[] = {
        {peerPath, peerInterface, "not a member"},
        {peerPath, peerInterface, ""},
        {peerPath, peerInterface, nullptr},
        {peerPath, "nodot", "Changed"},
        {"no/path", peerInterface, "Changed"},
        {"/it's", peerInterface, "Changed"},
        {peerPath, "\xff", "Changed"},
    };
    for (const auto& [path, interface, member] : cases) {
        RemoteObject object(peerName, path, interface, busType);
        EXPECT_EQ(object.setSignalHandlerString(member, onString), -1);
        const Texts lines = log.take();
        ASSERT_EQ(lines.size(), 1u);
        EXPECT_EQ(lines[0].find("remote_object.cpp Match error ("), 0u) << lines[0];
        EXPECT_EQ(lines[0].back(), ')');
        EXPECT_NE(lines[0], "remote_object.cpp Match error ()");
        dispatch(signalWith(peerPath, peerInterface, "Changed", "('x',)"));
        EXPECT_EQ(seen().count(), 0u);
    }
    EXPECT_EQ(proxy.setSignalHandlerString("Changed", nullptr), -1);
    log.take(); // the refused ones leave nothing to remove either
}

TEST_F(SignalTest, SignalsThatComeBeforeTheLoopStartsAreDelivered) {
    peer.reply("Ask");
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    emit("Changed", "('read by a call',)");
    ASSERT_EQ(call("Ask"), 0);
    emit("Changed", "('still in the socket',)");
    peer.run([](DBusConnection* connection) { dbus_connection_flush(connection); });
    const RunningLoop running(loop);
    ASSERT_TRUE(seen().waitFor(2));
    EXPECT_EQ(seen().events(), (Texts{"string /com/example/peer read by a call",
                                      "string /com/example/peer still in the socket"}));
}

TEST_F(SignalTest, CallbacksMayCallAndSubscribe) {
    static std::unique_ptr<RemoteObject> inner;
    inner = std::make_unique<RemoteObject>(peerName, "/inner", peerInterface, busType);
    peer.reply("Ask", with("answer"));
    ASSERT_EQ(proxy.setSignalHandlerString("Changed",
                                           [](RemoteObject*, const char* text) {
                                               seen().add(text + (" " + ask(*inner, "Ask")));
                                               inner->setSignalHandlerString("Changed", onString);
                                           }),
              0);
    const RunningLoop running(loop);
    emit("Changed", "('1',)");
    emit("Changed", "('2',)");
    settle();
    // The new record stands in front of the one being called, so it sees the next signal only.
    EXPECT_EQ(seen().events(), (Texts{"1 answer", "string /inner 2", "2 answer"}));
    inner.reset();
}

TEST_F(SignalTest, CallbacksMayDestroyProxiesTheirOwnToo) {
    static std::unique_ptr<RemoteObject> first, second, third;
    for (auto* object : {&first, &second, &third})
        *object = std::make_unique<RemoteObject>(peerName, "/doomed", peerInterface, busType);
    ASSERT_EQ(first->setSignalHandlerString("Changed", onString), 0);
    ASSERT_EQ(second->setSignalHandlerString("Changed", onString), 0);
    ASSERT_EQ(third->setSignalHandlerString("Changed",
                                            [](RemoteObject*, const char* text) {
                                                second.reset();
                                                third.reset();
                                                seen().add(text);
                                            }),
              0);
    const RunningLoop running(loop);
    for (const char* text : {"('1',)", "('2',)"})
        emit("Changed", text, "/doomed");
    settle();
    EXPECT_EQ(seen().events(), (Texts{"1", "string /doomed 1", "string /doomed 2"}));
    EXPECT_EQ(log.take(), Texts{});
    first.reset();
}

TEST_F(SignalTest, DestroyingAProxyWaitsForItsCallbackInAnotherThread) {
    static Latch entered, leave;
    struct Headset : RemoteObject {
        using RemoteObject::RemoteObject;
        ~Headset() override { unsubscribeAll(); }
        std::string name = "a headset, with a name too long for the string itself";
    };
    auto doomed = std::make_unique<Headset>(peerName, peerPath, peerInterface, busType);
    ASSERT_EQ(doomed->setSignalHandlerString("Changed",
                                             [](RemoteObject* receiver, const char*) {
                                                 entered.open();
                                                 leave.wait();
                                                 seen().add(static_cast<Headset*>(receiver)->name);
                                             }),
              0);
    const RunningLoop running(loop);
    emit("Changed", "('x',)");
    ASSERT_TRUE(entered.wait());
    Latch destroyed;
    std::thread destroyer([&] {
        doomed.reset();
        EXPECT_EQ(seen().count(), 1u); // the callback had its proxy to the end
        destroyed.open();
    });
    EXPECT_FALSE(destroyed.wait(Milliseconds(50)));
    leave.open();
    EXPECT_TRUE(destroyed.wait());
    destroyer.join();
    emit("Changed", "('y',)");
    settle();
    EXPECT_EQ(seen().events(), Texts{"a headset, with a name too long for the string itself"});
}

TEST_F(SignalTest, ProxiesComeAndGoInOtherThreadsWhileSignalsAreDelivered) {
    ASSERT_EQ(proxy.setSignalHandlerString("Changed", onString), 0);
    static std::atomic<int> calls;
    const auto count = [](RemoteObject* receiver, const char*) {
        calls += receiver->getPath()[0] == '/'; // is alive
    };
    const RunningLoop running(loop);
    inThreads(3, [&](int) {
        for (int round = 0; round < 50; ++round) {
            RemoteObject object(peerName, peerPath, peerInterface, busType);
            object.setSignalHandlerString("Changed", count);
            emit("Changed", "('x',)");
            object.setSignalHandlerString("Changed", count);
        }
    });
    settle();
    EXPECT_EQ(seen().count(), 150u); // the constant subscriber missed none
    EXPECT_GT(calls, 0);
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(SignalTest, StoppingLeavesTheRestUndeliveredForGood) {
    static RemoteObject* runs;
    runs = &loop;
    static Latch stopped;
    ASSERT_EQ(proxy.setSignalHandlerString("Changed",
                                           [](RemoteObject* receiver, const char* text) {
                                               onString(receiver, text);
                                               receiver->stopLoop();
                                               EXPECT_EQ(runs->waitLoop(), EDEADLK); // itself
                                               stopped.open();
                                           }),
              0);
    for (const char* text : {"('1',)", "('2',)", "('3',)"})
        emit("Changed", text);
    EXPECT_NE(loop.waitLoop(), 0); // never started
    ASSERT_EQ(loop.startLoop(), 0);
    ASSERT_TRUE(stopped.wait());
    EXPECT_EQ(loop.waitLoop(), 0);
    EXPECT_NE(loop.waitLoop(), 0); // joined already
    EXPECT_EQ(seen().events(), Texts{"string /com/example/peer 1"});
    ASSERT_EQ(proxy.startLoop(), 0); // a new thread ends at once
    EXPECT_EQ(proxy.waitLoop(), 0);
    EXPECT_EQ(seen().count(), 1u);
    EXPECT_TRUE(BusLink::isStopRequested());
}

/// @param whileCalling whether another thread waits for a reply, and so reads in the loop's place
class StopTest : public SignalTest, public testing::WithParamInterface<bool> {};

TEST_P(StopTest, EndsASleepingLoopAtOnceAndCallsGoOnAfterwards) {
    const bool whileCalling = GetParam();
    peer.reply("Ask");
    peer.reply("AskSlowly", {}, Milliseconds(2000));
    ASSERT_EQ(loop.startLoop(), 0);
    std::thread caller;
    if (whileCalling) {
        caller = std::thread([&] { EXPECT_EQ(call("AskSlowly"), 0); });
        EXPECT_TRUE(peer.waitForCalls("AskSlowly", 1));
    }
    settle(); // it sleeps again soon
    const auto begin = std::chrono::steady_clock::now();
    loop.stopLoop();
    EXPECT_EQ(loop.waitLoop(), 0);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, Milliseconds(500)); // 1 and a busy host
    if (caller.joinable())
        caller.join();
    EXPECT_EQ(call("Ask"), 0);
}

INSTANTIATE_TEST_SUITE_P(, StopTest, testing::Bool(), [](const auto& row) {
    return row.param ? "WhileAnotherThreadCalls" : "WhenIdle";
});

/// A bus that lets a connection have one match rule.
TEST(SignalLimitTest, TheBusRefusalOfARuleIsTold) {
    SyslogCapture log;
    PrivateBus bus(PrivateBus::Kind::Session,
                   "<limit name=\"max_match_rules_per_connection\">1</limit>");
    RemoteObject proxy(peerName, peerPath, peerInterface, DBUS_BUS_SESSION);
    EXPECT_EQ(proxy.setSignalHandlerString("A", onString), 0);
    EXPECT_EQ(proxy.setSignalHandlerString("B", onString), -1);
    const Texts lines = log.take();
    ASSERT_EQ(lines.size(), 1u);
    EXPECT_NE(lines[0].find("(Connection \""), std::string::npos) << lines[0];
}

} // namespace Bluetooth::Test
