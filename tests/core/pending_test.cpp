// SPDX-License-Identifier: LGPL-2.1-or-later
// Calls without a time limit: what ends the wait, and who is served during it.

#include "support/peer_test.h"

#include <csignal>
#include <memory>
#include <thread>
#include <unistd.h>

namespace Bluetooth::Test {

namespace {

constexpr const char* noReply = "-1 2 Reply message is null";

/// Who answered requests to the object of this process.
Recorder<std::thread::id>& served() {
    static Recorder<std::thread::id> recorder;
    return recorder;
}

} // namespace

class PendingTest : public LoopTest {
protected:
    PendingTest() {
        // The first call installs the handlers: no interruption of the tests ends the process.
        peer.reply("Quick", with("now"));
        EXPECT_EQ(callPending("Quick"), 0);
        peer.forgetCalls();
    }

    int callPending(const char* method) { return callPending(proxy, method); }
    static int callPending(RemoteObject& object, const char* method) {
        object.resetError();
        EXPECT_EQ(object.newMessage(method), 0);
        return object.sendMessagePending();
    }
    /// @return the text that a method is answered with, or how it was not
    std::string textFrom(const char* method) {
        EXPECT_EQ(callPending(method), 0);
        std::string text;
        const int result = proxy.getReplyValue(text);
        return result == 0 ? text : outcomeOf(proxy, result);
    }

    /// Does something as soon as Slow has been called.
    std::future<void> onceSlowWaits(const std::function<void()>& action) {
        return std::async(std::launch::async, [this, action] {
            EXPECT_TRUE(peer.waitForCalls("Slow", 1));
            action();
        });
    }

    void serveAgent() {
        served().clear();
        onRequest() = [] {
            served().add(std::this_thread::get_id());
            return std::string("5820");
        };
        serveObject(proxy.getConnection());
    }

    std::future<MessagePtr> askAgent(Milliseconds timeout = patience) {
        return peer.call(proxy.getConnectionName(), "/object", "com.example.Object", "Do", {},
                         timeout);
    }

    /// Pair asks the agent at once, `count` times, and is answered right after that.
    void pairAsks(int count) {
        peer.handle("Pair", [this, count](DBusMessage* pair) {
            for (int i = 0; i < count; ++i) {
                MessagePtr request = requestTo(proxy.getConnectionName());
                dbus_message_set_no_reply(request.get(), true);
                peer.send(std::move(request));
            }
            return replyTo(pair);
        });
    }
};

TEST_F(PendingTest, TheReplyIsHeldWhateverItIs) {
    peer.reply("Pair", with(Path{"/dev"}), Milliseconds(150));
    ObjectPath path;
    EXPECT_EQ(callPending("Pair"), 0);
    EXPECT_EQ(proxy.getReplyValue(path), 0);
    EXPECT_STREQ(path, "/dev");
    peer.replyError("Pair", "org.bluez.Error.Failed", "Authentication Failed");
    EXPECT_EQ(callPending("Pair"), 0); // an error reply is a reply
    EXPECT_FALSE(proxy.hasError());
    EXPECT_EQ(proxy.getReplyValue(path), -2);
    EXPECT_STREQ(proxy.getErrorName(), "org.bluez.Error.Failed");
    EXPECT_EQ(outcomeOf(proxy, -2), "-2 11 Authentication Failed");
}

TEST_F(PendingTest, WhatComesAtOnceIsNotLeftToTheReceiveThread) {
    serveAgent();
    const RunningLoop running(loop); // also reads the connection
    pairAsks(1);
    constexpr int rounds = 300;
    for (int i = 0; i < rounds; ++i) {
        ASSERT_EQ(callPending("Pair"), 0);
        ASSERT_EQ(textFrom("Quick"), "now");
    }
    EXPECT_EQ(served().count(), static_cast<std::size_t>(rounds));
}

TEST_F(PendingTest, ACallbackThatWaitsServesRequestsToo) {
    serveAgent();
    pairAsks(1);
    ASSERT_EQ(proxy.setSignalHandlerNoArgument(
                  "Changed", [](RemoteObject* receiver) { callPending(*receiver, "Pair"); }),
              0);
    const RunningLoop running(loop);
    peer.emit(peerPath, peerInterface, "Changed");
    EXPECT_TRUE(served().waitFor(1));
}

TEST_F(PendingTest, ALateReplyAfterAnInterruptionChangesNothing) {
    auto doomed = std::make_unique<RemoteObject>(peerName, peerPath, peerInterface, busType);
    for (const auto& [number, caller] :
         {std::pair(SIGINT, &proxy), std::pair(SIGTERM, doomed.get())}) {
        peer.forgetCalls();
        MessagePtr late;
        peer.handle("Slow", [&](DBusMessage* request) {
            late = replyTo(request, with("late"));
            return MessagePtr();
        });
        const auto interrupter = onceSlowWaits([signal = number] { kill(getpid(), signal); });
        EXPECT_EQ(callPending(*caller, "Slow"), 0);
        std::string text;
        EXPECT_EQ(outcomeOf(*caller, caller->getReplyValue(text)), noReply);
        if (number == SIGTERM)
            doomed.reset(); // then it is the reply of a proxy that is gone

        // The next call gets its own reply, and is not taken for interrupted.
        peer.handle(
            "Next",
            [&](DBusMessage* request) {
                peer.send(std::move(late));
                return replyTo(request, with("mine"));
            },
            Milliseconds(50));
        EXPECT_EQ(textFrom("Next"), "mine");
    }
}

TEST_F(PendingTest, TheInterruptHandlersStayAndAnInterruptionInBetweenEndsTheNextWait) {
    peer.neverReply("Slow");
    for (const int number : {SIGINT, SIGTERM}) {
        struct sigaction installed = {};
        sigaction(number, nullptr, &installed);
        EXPECT_NE(installed.sa_handler, SIG_DFL);
        EXPECT_TRUE(installed.sa_flags & SA_NOCLDSTOP);
        EXPECT_EQ(raise(number), 0);
        EXPECT_EQ(textFrom("Slow"), noReply);
    }
    EXPECT_EQ(textFrom("Quick"), "now"); // and only the next
}

TEST_F(PendingTest, TheWaitEndsWhenTheConnectionCloses) {
    peer.neverReply("Slow");
    const auto killer = onceSlowWaits([&] { bus.kill(); });
    EXPECT_EQ(callPending("Slow"), 0); // it had been sent
    // libdbus itself answers what is pending on a connection that closes.
    std::string text;
    EXPECT_EQ(proxy.getReplyValue(text), -1);
    EXPECT_TRUE(proxy.hasError());
    EXPECT_EQ(textFrom("Slow"), noReply); // libdbus takes it, and forgets it
}

TEST_F(PendingTest, RequestsAreServedOnTheWaitingThreadWhileTheReceiveThreadDeliversSignals) {
    serveAgent();
    static Recorder<std::thread::id> delivered;
    delivered.clear();
    const auto self = std::this_thread::get_id();
    ASSERT_EQ(proxy.setSignalHandlerNoArgument(
                  "Changed", [](RemoteObject*) { delivered.add(std::this_thread::get_id()); }),
              0);
    const RunningLoop running(loop);
    EXPECT_EQ(askAgent(Milliseconds(300)).get(), nullptr) << "only the waiting thread answers";
    MessagePtr request;
    peer.handle("Pair", [&](DBusMessage* pair) {
        request.reset(dbus_message_ref(pair));
        return MessagePtr();
    });
    const auto daemon = std::async(std::launch::async, [&] {
        EXPECT_TRUE(peer.waitForCalls("Pair", 1));
        for (int i = 0; i < 20; ++i) {
            peer.emit(peerPath, peerInterface, "Changed");
            const MessagePtr answer = askAgent().get();
            ASSERT_TRUE(answer);
            EXPECT_EQ(argumentsOf(answer.get()), "s:5820");
        }
        EXPECT_TRUE(delivered.waitFor(20)); // before the wait ends
        peer.send(replyTo(request.get()));
    });
    EXPECT_EQ(callPending("Pair"), 0);
    EXPECT_EQ(served().events(), std::vector<std::thread::id>(20, self));
    for (const std::thread::id& thread : delivered.events())
        EXPECT_NE(thread, self);
}

TEST_F(PendingTest, AnInterruptionLeavesTheRequestsThatAreStillQueued) {
    serveAgent();
    onRequest() = [answer = onRequest()] {
        EXPECT_EQ(raise(SIGINT), 0);
        return answer();
    };
    pairAsks(3);
    EXPECT_EQ(textFrom("Pair"), noReply);
    EXPECT_EQ(served().count(), 1u);
}

TEST_F(PendingTest, OtherThreadsCallWhileOneWaits) {
    peer.neverReply("Slow");
    const auto other = onceSlowWaits([&] {
        RemoteObject object(peerName, peerPath, peerInterface, busType);
        for (int i = 0; i < 100; ++i)
            EXPECT_EQ(call(object, "Quick"), 0);
        EXPECT_EQ(call(object, "Slow", 50), -1);
        kill(getpid(), SIGINT);
    });
    EXPECT_EQ(textFrom("Slow"), noReply);
}

} // namespace Bluetooth::Test
