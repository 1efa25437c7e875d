// Programs that dispatch the shared connection themselves, as those with a main loop do.

#include "support/core_test.h"
#include "support/receive_loop.h"

#include <atomic>
#include <memory>
#include <thread>

namespace Bluetooth::Test {

namespace {

Recorder<std::string>& seen() {
    static Recorder<std::string> recorder;
    return recorder;
}

/// What the program's object does when it is asked; its answer goes back.
std::function<std::string()>& onRequest() {
    static std::function<std::string()> action;
    return action;
}

DBusHandlerResult serve(DBusConnection* connection, DBusMessage* request, void*) {
    const MessagePtr reply(dbus_message_new_method_return(request));
    Writer(reply.get())(onRequest()());
    dbus_connection_send(connection, reply.get(), nullptr);
    return DBUS_HANDLER_RESULT_HANDLED;
}

} // namespace

class OwnDispatchTest : public CoreTest {
protected:
    void SetUp() override {
        KES_NEEDS_RECEIVE_LOOP();
        seen().clear();
        peer.reply("Ask", [](Writer& w) { w("answer"); });
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
    static const DBusObjectPathVTable handlers = [] {
        DBusObjectPathVTable table{};
        table.message_function = serve;
        return table;
    }();
    ASSERT_TRUE(
        dbus_connection_register_object_path(proxy.getConnection(), "/object", &handlers, nullptr));
    onRequest() = [this] {
        RemoteObject inner(peerName, peerPath, peerInterface, busType);
        std::string answer;
        EXPECT_EQ(call(inner, "Ask"), 0);
        EXPECT_EQ(inner.getReplyValue(answer), 0);
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
        MessagePtr request(dbus_message_new_method_call(proxy.getConnectionName(), "/object",
                                                        "com.example.Object", "Do"));
        peer.send(std::move(request));
        return MessagePtr(dbus_message_new_method_return(pair));
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

TEST_F(OwnDispatchTest, CallsAndSignalsOfOtherThreadsAreNotLostToIt) {
    ASSERT_EQ(proxy.setSignalHandlerString(
                  "Changed", [](RemoteObject*, const char* text) { seen().add(text); }),
              0);
    RemoteObject loop(peerName, "/loop", "com.example.Loop", busType);
    const ReceiveLoop running(loop);
    constexpr int count = 300;
    std::atomic<bool> callsDone{false};
    std::thread caller([&] {
        RemoteObject object(peerName, peerPath, peerInterface, busType);
        for (int i = 0; i < count; ++i) {
            std::string answer;
            EXPECT_EQ(call(object, "Ask", 5000), 0) << object.getErrorMessage();
            EXPECT_EQ(object.getReplyValue(answer), 0);
            peer.emit(peerPath, peerInterface, "Changed", [i](Writer& w) { w(std::to_string(i)); });
        }
        callsDone = true;
    });
    mainLoop([&] { return callsDone && seen().count() == count; });
    caller.join();
    std::vector<std::string> expected;
    expected.reserve(count);
    for (int i = 0; i < count; ++i)
        expected.push_back(std::to_string(i));
    EXPECT_EQ(seen().events(), expected);
}

} // namespace Bluetooth::Test
