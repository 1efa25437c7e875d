// SPDX-License-Identifier: LGPL-2.1-or-later
// Programs that dispatch the shared connection themselves, as those with a main loop do.

#include "support/peer_test.h"

#include <atomic>
#include <memory>
#include <thread>

namespace Bluetooth::Test {

class OwnDispatchTest : public LoopTest {
protected:
    OwnDispatchTest() {
        peer.reply("Ask", with("answer"));
        peer.reply("Take");
    }

    /// Dispatches as a main loop does until `done`.
    void mainLoop(const std::function<bool()>& done) {
        const auto deadline = std::chrono::steady_clock::now() + patience;
        while (!done() && std::chrono::steady_clock::now() < deadline)
            dbus_connection_read_write_dispatch(proxy.getConnection(), 20);
        EXPECT_TRUE(done());
    }
};

TEST_F(OwnDispatchTest, HandlersOfTheProgramMayCall) {
    serveObject(proxy.getConnection());
    onRequest() = [] {
        RemoteObject inner(peerName, peerPath, peerInterface, busType);
        std::string answer;
        EXPECT_EQ(ask(inner, "Ask"), "answer");
        EXPECT_EQ(inner.newMessage("Take"), 0);
        EXPECT_EQ(inner.sendMessage(false, -1), 0);
        EXPECT_EQ(inner.newMessage("Ask"), 0);
        EXPECT_EQ(inner.sendMessagePending(), 0);
        EXPECT_EQ(inner.getReplyValue(answer), 0);
        return answer;
    };
    auto reply = peer.call(proxy.getConnectionName(), "/object", "com.example.Object", "Do");
    mainLoop([&] { return reply.wait_for(std::chrono::seconds(0)) == std::future_status::ready; });
    const MessagePtr answer = reply.get();
    ASSERT_TRUE(answer);
    EXPECT_EQ(argumentsOf(answer.get()), "s:answer");
    EXPECT_TRUE(peer.waitForCalls("Take", 1));
    // On the same thread, outside its dispatch, requests are answered while a call waits.
    peer.handle("Pair", [this](DBusMessage* pair) {
        peer.send(requestTo(proxy.getConnectionName()));
        return replyTo(pair);
    });
    bool asked = false;
    onRequest() = [&asked] {
        asked = true;
        return std::string();
    };
    ASSERT_EQ(proxy.newMessage("Pair"), 0);
    EXPECT_EQ(proxy.sendMessagePending(), 0);
    EXPECT_TRUE(asked);
}

TEST_F(OwnDispatchTest, ARequestThatIsKeptDoesNotChangeLaterCalls) {
    static MessagePtr kept;
    DBusObjectPathVTable keeper{};
    keeper.message_function = [](DBusConnection*, DBusMessage* request, void*) {
        kept.reset(dbus_message_ref(request));
        return DBUS_HANDLER_RESULT_HANDLED;
    };
    ASSERT_TRUE(
        dbus_connection_register_object_path(proxy.getConnection(), "/keeper", &keeper, nullptr));
    auto late = peer.call(proxy.getConnectionName(), "/keeper", "com.example.Object", "Do");
    mainLoop([] { return kept != nullptr; });
    serveObject(proxy.getConnection());
    int requests = 0;
    onRequest() = [&requests] { return std::to_string(++requests); };
    peer.send(requestTo(proxy.getConnectionName()));
    mainLoop([&] { return requests == 1; }); // the next message

    peer.handle("Pair", [this](DBusMessage* pair) {
        peer.send(requestTo(proxy.getConnectionName()));
        return replyTo(pair);
    });
    ASSERT_EQ(proxy.newMessage("Pair"), 0);
    EXPECT_EQ(proxy.sendMessagePending(), 0);
    EXPECT_EQ(requests, 2) << "answered while the call waits, as outside a dispatch";
    dbus_connection_send(proxy.getConnection(), replyTo(kept.get()).get(), nullptr);
    EXPECT_TRUE(late.get());
    kept.reset();
}

TEST_F(OwnDispatchTest, WhatANotificationSaysIsActedOnAfterTheDispatch) {
    const MessagePtr question(
        dbus_message_new_method_call(peerName, peerPath, peerInterface, "Ask"));
    DBusPendingCall* begun = nullptr;
    ASSERT_TRUE(dbus_connection_send_with_reply(proxy.getConnection(), question.get(), &begun, -1));
    const PendingPtr pending(begun);
    static bool answered = false;
    const auto notify = [](DBusPendingCall*, void*) { answered = true; }; // must not call
    ASSERT_TRUE(dbus_pending_call_set_notify(begun, notify, nullptr, nullptr));
    mainLoop([] { return answered; });
    EXPECT_EQ(ask(proxy, "Ask"), "answer");
}

TEST_F(OwnDispatchTest, CallsAndSignalsOfOtherThreadsAreNotLostToIt) {
    ASSERT_EQ(proxy.setSignalHandlerString(
                  "Changed", [](RemoteObject*, const char* text) { seen().add(text); }),
              0);
    const RunningLoop running(loop);
    constexpr int count = 300;
    std::atomic<bool> callsDone{false};
    std::thread caller([&] {
        RemoteObject object(peerName, peerPath, peerInterface, busType);
        for (int i = 0; i < count; ++i) {
            EXPECT_EQ(ask(object, "Ask"), "answer");
            peer.emit(peerPath, peerInterface, "Changed", with(std::to_string(i)));
        }
        callsDone = true;
    });
    mainLoop([&] { return callsDone && seen().count() == count; });
    caller.join();
    const Texts events = seen().events();
    for (int i = 0; i < count; ++i)
        EXPECT_EQ(events[static_cast<std::size_t>(i)], std::to_string(i));
}

} // namespace Bluetooth::Test
