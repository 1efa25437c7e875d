// Method calls: how they are built and sent, what failures record.

#include "support/peer_test.h"
#include "support/stdout_capture.h"

#include <bluetooth/connection.h>

#include <limits>
#include <tuple>

namespace Bluetooth::Test {

namespace {

constexpr const char* notUtf8 = "\xff\xfe";

} // namespace

using CallTest = CoreTest;

TEST_F(CallTest, ArgumentsArriveWithTheirTypesInOrder) {
    peer.reply("Take");
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    EXPECT_EQ(proxy.append(true), 0);
    EXPECT_EQ(proxy.append("naïve"), 0);
    EXPECT_EQ(proxy.append(ObjectPath("/")), 0);
    EXPECT_EQ(proxy.append(std::numeric_limits<unsigned int>::max()), 0);
    EXPECT_EQ(proxy.append(std::numeric_limits<unsigned short>::max()), 0);
    EXPECT_EQ(proxy.append(Variant(7u)), 0);
    EXPECT_EQ(proxy.append(Variant(std::uint16_t{8})), 0);
    EXPECT_EQ(proxy.append(Variant(true)), 0);
    EXPECT_EQ(proxy.append(Variant(std::string())), 0);
    EXPECT_EQ(proxy.sendMessage(true, -1), 0);
    EXPECT_FALSE(proxy.hasError());
    ASSERT_EQ(peer.calls().size(), 1u);
    const SeenCall seen = peer.calls()[0];
    EXPECT_EQ(seen.text(), "Take b:1 s:naïve o:/ u:4294967295 q:65535 v(u:7) v(q:8) v(b:1) v(s:)");
    EXPECT_EQ(seen.path, peerPath);
    EXPECT_EQ(seen.interface, peerInterface);
}

TEST_F(CallTest, ArraysAndSignedNumbersAreLeftOutOfTheCallWithSuccessAndAnError) {
    peer.reply("SetProperty");
    for (const Variant& value : {Variant(Texts{"a"}), Variant(std::int32_t{-1})}) {
        proxy.resetError();
        ASSERT_EQ(proxy.newMessage("SetProperty"), 0);
        ASSERT_EQ(proxy.append("Name"), 0);
        EXPECT_EQ(proxy.append(value), 0);
        EXPECT_EQ(proxy.getErrorNumber(), 8);
        EXPECT_EQ(proxy.getErrorMessage(), "Failed to append args = iterator");
        EXPECT_EQ(proxy.sendMessage(true, -1), 0);
    }
    EXPECT_EQ(peer.callTexts(), (Texts{"SetProperty s:Name", "SetProperty s:Name"}));
}

TEST_F(CallTest, UnusableArgumentsAreRefusedAndTheCallCanStillBeMade) {
    peer.reply("Take");
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    const std::tuple<std::function<int()>, int, const char*> cases[] = {
        {[&] { return proxy.newMessage(nullptr); }, 1, "Parameter is null"},
        {[&] { return proxy.append(static_cast<const char*>(nullptr)); }, 1, "Parameter is null"},
        {[&] { return proxy.append(notUtf8); }, 7, "Failed to append args to message"},
        {[&] { return proxy.append(ObjectPath("dev")); }, 3, "Invalid path"},
        {[&] { return proxy.append(ObjectPath("")); }, 3, "Invalid path"},
        {[&] { return proxy.append(ObjectPath("/a//b")); }, 7, "Failed to append args to message"},
        {[&] { return proxy.append(Variant(std::string(notUtf8))); }, 8,
         "Failed to append args = iterator"},
        {[&] { return proxy.setReplyMessage(nullptr); }, 2, "Reply message is null"},
    };
    for (const auto& [append, number, text] : cases) {
        proxy.resetError();
        EXPECT_EQ(append(), -1) << text;
        EXPECT_EQ(proxy.getErrorNumber(), number);
        EXPECT_EQ(proxy.getErrorMessage(), text);
    }
    // Errors stay until they are reset; the call that was begun is still there.
    EXPECT_EQ(proxy.append(1u), 0);
    EXPECT_EQ(proxy.sendMessage(true, -1), 0);
    EXPECT_TRUE(proxy.hasError());
    EXPECT_EQ(proxy.getErrorMessage(), "Reply message is null");
    proxy.resetError();
    EXPECT_FALSE(proxy.hasError());
    EXPECT_EQ(proxy.getErrorMessage(), "");
    EXPECT_EQ(peer.callTexts(), Texts{"Take u:1"});
}

TEST_F(CallTest, UnusableNamesMakeNoMessageAndEveryStepAfterFails) {
    const struct {
        const char* destination;
        const char* path;
        const char* interface;
        const char* method;
    } cases[] = {
        {"no name", peerPath, peerInterface, "Take"}, {"", peerPath, peerInterface, "Take"},
        {peerName, "dev", peerInterface, "Take"},     {peerName, "/a/", peerInterface, "Take"},
        {peerName, peerPath, "nodot", "Take"},        {peerName, peerPath, notUtf8, "Take"},
        {peerName, peerPath, peerInterface, "a.b"},   {peerName, peerPath, peerInterface, ""},
    };
    for (const auto& unusable : cases) {
        RemoteObject object(unusable.destination, unusable.path, unusable.interface, busType);
        EXPECT_EQ(object.newMessage(unusable.method), -1);
        EXPECT_EQ(object.getErrorMessage(), "Failed to create message");
        const std::pair<std::function<int()>, int> steps[] = {
            {[&] { return object.append(1u); }, 7},
            {[&] { return object.append(Variant(1u)); }, 8},
            {[&] { return object.append(Variant(Texts{})); }, 8},
            {[&] { return object.sendMessage(false, -1); }, 10},
            {[&] { return object.sendMessage(true, -1); }, 11},
            {[&] { return object.sendMessagePending(); }, 11}};
        for (const auto& [step, number] : steps) {
            object.resetError();
            EXPECT_EQ(step(), -1);
            EXPECT_EQ(object.getErrorNumber(), number);
        }
    }
    // A name that is none also ends the call that was begun before.
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    EXPECT_EQ(proxy.newMessage("a.b"), -1);
    EXPECT_EQ(proxy.sendMessage(false, -1), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "Failed to send message");
    EXPECT_EQ(peer.calls().size(), 0u);
}

TEST_F(CallTest, WithoutABusEveryCallFailsAndNothingAborts) {
    PrivateBus::address(PrivateBus::Kind::System); // where nobody listens
    const std::string noBus = "connection.cpp Failed to get bus connection";
    EXPECT_EQ(Connection::get(DBUS_BUS_SYSTEM), nullptr);
    Connection::unref(nullptr);
    RemoteObject object(peerName, peerPath, peerInterface, DBUS_BUS_SYSTEM);
    EXPECT_EQ(log.take(), (Texts{noBus, noBus}));
    EXPECT_EQ(object.getConnection(), nullptr);
    EXPECT_STREQ(object.getConnectionName(), "");

    ASSERT_EQ(object.newMessage("Take"), 0);
    EXPECT_EQ(object.sendMessage(true, -1), -1);
    EXPECT_EQ(object.getErrorNumber(), 11);
    EXPECT_NE(object.getErrorMessage(), "");
    ASSERT_EQ(object.newMessage("Take"), 0);
    EXPECT_EQ(object.sendMessage(false, -1), -1);
    EXPECT_EQ(object.getErrorNumber(), 10);
    ASSERT_EQ(object.newMessage("Take"), 0);
    EXPECT_EQ(object.sendMessagePending(), -1);
    EXPECT_EQ(object.getErrorNumber(), 11);
    std::string text;
    EXPECT_EQ(object.getReplyValue(text), -1);
    EXPECT_EQ(object.getErrorNumber(), 2);

    EXPECT_EQ(object.setSignalHandlerNoArgument("Changed", [](RemoteObject*) {}), -1);
    EXPECT_EQ(log.take(), Texts{"remote_object.cpp Match error (Not connected to the bus)"});
    EXPECT_EQ(object.startLoop(), 0);
    EXPECT_EQ(object.waitLoop(), 0);
}

TEST_F(CallTest, ProxiesShareTheConnectionOfTheirBusAndTellWhatTheyAre) {
    DBusConnection* connection = Connection::get(busType);
    EXPECT_EQ(connection, proxy.getConnection());
    Connection::unref(connection);
    EXPECT_STREQ(proxy.getConnectionName(), dbus_bus_get_unique_name(connection));
    StdoutCapture output;
    proxy.printInfo();
    std::cout << std::flush;
    EXPECT_EQ(output.take(), proxy.getInfo());
    EXPECT_EQ(proxy.getInfo(), "RemoteObject name: com.example.Peer\n"
                               "Path: /com/example/peer\n"
                               "Interface: com.example.Peer\n");
}

TEST_F(CallTest, AFailedCallRecordsTheServicesOwnText) {
    peer.replyError("Refuse", "com.example.Error.No", "not today");
    EXPECT_EQ(call("Refuse"), -1);
    EXPECT_EQ(proxy.getErrorNumber(), 11);
    EXPECT_EQ(proxy.getErrorMessage(), "not today");
    EXPECT_EQ(call("NoSuchMethod"), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "No such method");
    RemoteObject absent("com.example.Absent", peerPath, peerInterface, busType);
    EXPECT_EQ(call(absent, "Take"), -1);
    EXPECT_NE(absent.getErrorMessage().find("com.example.Absent"), std::string::npos);
}

TEST_F(CallTest, CallsWithoutReplyAreWrittenAtOnceAndLeaveNoReply) {
    peer.reply("Ask", [](Writer& w) { w("old"); });
    peer.reply("Take");
    ASSERT_EQ(call("Ask"), 0);
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    ASSERT_EQ(proxy.append(std::string(5'000'000, 'x').c_str()), 0); // more than a socket takes
    EXPECT_EQ(proxy.sendMessage(false, 1), 0);
    EXPECT_FALSE(dbus_connection_has_messages_to_send(proxy.getConnection()));
    ASSERT_TRUE(peer.waitForCalls("Take", 1));
    EXPECT_FALSE(peer.calls()[1].wantsReply);
    std::string text;
    EXPECT_EQ(proxy.getReplyValue(text), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "Reply message is null");
    EXPECT_EQ(proxy.sendMessage(false, -1), -1); // the message was used up
    EXPECT_EQ(proxy.getErrorNumber(), 10);
}

TEST_F(CallTest, TimeOutsAreKeptAndALateReplyIsNobodys) {
    peer.reply(
        "Slow", [](Writer& w) { w("late"); }, Milliseconds(400));
    peer.reply("Quick", [](Writer& w) { w("mine"); });
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(call("Slow", 100), -1);
    EXPECT_GE(std::chrono::steady_clock::now() - begin, Milliseconds(100));
    EXPECT_EQ(proxy.getErrorMessage().substr(0, 23), "Did not receive a reply");
    proxy.resetError();
    EXPECT_EQ(call("Quick", 0x7fffffff), 0);
    EXPECT_EQ(call("Slow", -1), 0); // by now the first one's reply has come
    std::string text;
    EXPECT_EQ(call("Quick"), 0);
    EXPECT_EQ(proxy.getReplyValue(text), 0);
    EXPECT_EQ(text, "mine");
    EXPECT_EQ(call("Quick", -2), -1);
    EXPECT_EQ(proxy.getErrorNumber(), 11);
}

} // namespace Bluetooth::Test
