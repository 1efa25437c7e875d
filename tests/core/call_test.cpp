// SPDX-License-Identifier: LGPL-2.1-or-later
// Method calls: how they are built and sent, what failures record.

#include "support/peer_test.h"
#include "support/stdout_capture.h"

#include <bluetooth/connection.h>

#include <array>
#include <limits>

namespace Bluetooth::Test {

namespace {

constexpr const char* notUtf8 = "\xff\xfe";
constexpr const char* notAppended = "-1 7 Failed to append args to message";
constexpr const char* notSent = "-1 10 Failed to send message";
constexpr const char* noReply = "-1 2 Reply message is null";

} // namespace

class CallTest : public CoreTest {
protected:
    std::string outcome(int result) { return outcomeOf(proxy, result); }
};

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
    EXPECT_FALSE(proxy.hasError());
    // Left out with success and an error: arrays and signed numbers.
    for (const Variant& value : {Variant(Texts{"a"}), Variant(std::int32_t{-1})})
        EXPECT_EQ(outcome(proxy.append(value)), "0 8 Failed to append args = iterator");
    EXPECT_EQ(proxy.sendMessage(true, -1), 0);
    ASSERT_EQ(peer.calls().size(), 1u);
    const SeenCall seen = peer.calls()[0];
    EXPECT_EQ(seen.text(), "Take b:1 s:naïve o:/ u:4294967295 q:65535 v(u:7) v(q:8) v(b:1) v(s:)");
    EXPECT_EQ(seen.path, peerPath);
    EXPECT_EQ(seen.interface, peerInterface);
}

TEST_F(CallTest, UnusableArgumentsAreRefusedAndTheCallCanStillBeMade) {
    peer.reply("Take");
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    const char* const null = nullptr;
    EXPECT_EQ(outcome(proxy.newMessage(null)), "-1 1 Parameter is null");
    EXPECT_EQ(outcome(proxy.append(null)), "-1 1 Parameter is null");
    EXPECT_EQ(outcome(proxy.append(notUtf8)), notAppended);
    EXPECT_EQ(outcome(proxy.append(ObjectPath("dev"))), "-1 3 Invalid path");
    EXPECT_EQ(outcome(proxy.append(ObjectPath(""))), "-1 3 Invalid path");
    EXPECT_EQ(outcome(proxy.append(ObjectPath("/a//b"))), notAppended);
    EXPECT_EQ(outcome(proxy.append(Variant(std::string(notUtf8)))),
              "-1 8 Failed to append args = iterator");
    EXPECT_EQ(proxy.setReplyMessage(nullptr), -1);
    EXPECT_TRUE(proxy.hasError());
    // Errors stay until they are reset; the call that was begun is still there.
    EXPECT_EQ(proxy.append(1u), 0);
    EXPECT_EQ(outcome(proxy.sendMessage(true, -1)), "0 2 Reply message is null");
    EXPECT_FALSE(proxy.hasError());
    EXPECT_EQ(proxy.getErrorMessage(), "");
    EXPECT_EQ(peer.callTexts(), Texts{"Take u:1"});
}

TEST_F(CallTest, UnusableNamesMakeNoMessageAndEveryStepAfterFails) {
    const std::array<const char*, 4> cases[] = {
        {"no name", peerPath, peerInterface, "Take"}, {"", peerPath, peerInterface, "Take"},
        {peerName, "dev", peerInterface, "Take"},     {peerName, "/a/", peerInterface, "Take"},
        {peerName, peerPath, "nodot", "Take"},        {peerName, peerPath, notUtf8, "Take"},
        {peerName, peerPath, peerInterface, "a.b"},   {peerName, peerPath, peerInterface, ""},
    };
    for (const auto& [destination, path, interface, method] : cases) {
        RemoteObject object(destination, path, interface, busType);
        EXPECT_EQ(outcomeOf(object, object.newMessage(method)), "-1 6 Failed to create message");
        EXPECT_EQ(outcomeOf(object, object.append(1u)), notAppended);
        for (const Variant& value : {Variant(1u), Variant(Texts{})})
            EXPECT_EQ(outcomeOf(object, object.append(value)),
                      "-1 8 Failed to append args = iterator");
        EXPECT_EQ(outcomeOf(object, object.sendMessage(false, -1)), notSent);
        EXPECT_EQ(outcomeOf(object, object.sendMessage(true, -1)),
                  "-1 11 There is no message to send");
        EXPECT_EQ(outcomeOf(object, object.sendMessagePending()), "-1 11 ");
    }
    // A name that is none also ends the call that was begun before.
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    EXPECT_EQ(proxy.newMessage("a.b"), -1);
    EXPECT_EQ(outcome(proxy.sendMessage(false, -1)), notSent);
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
    EXPECT_EQ(Connection::get(static_cast<DBusBusType>(DBUS_BUS_STARTER + 1)), nullptr);
    EXPECT_EQ(log.take(), Texts{noBus});
    EXPECT_STREQ(object.getConnectionName(), "");

    EXPECT_EQ(ask(object, "Take"), "-1 11 Not connected to the bus");
    ASSERT_EQ(object.newMessage("Take"), 0);
    EXPECT_EQ(outcomeOf(object, object.sendMessage(false, -1)), notSent);
    ASSERT_EQ(object.newMessage("Take"), 0);
    EXPECT_EQ(outcomeOf(object, object.sendMessagePending()), "-1 11 ");
    std::string text;
    EXPECT_EQ(outcomeOf(object, object.getReplyValue(text)), noReply);

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
    EXPECT_EQ(output.take(), "RemoteObject name: com.example.Peer\n"
                             "Path: /com/example/peer\n"
                             "Interface: com.example.Peer\n");
}

TEST_F(CallTest, AFailedCallRecordsTheServicesOwnNameAndText) {
    peer.replyError("Refuse", "com.example.Error.No", "not today");
    EXPECT_EQ(call("Refuse"), -1);
    EXPECT_STREQ(proxy.getErrorName(), "com.example.Error.No");
    EXPECT_EQ(outcome(-1), "-1 11 not today");
    EXPECT_STREQ(proxy.getErrorName(), "") << "forgotten with the error";
    EXPECT_EQ(call("Refuse"), -1);
    EXPECT_EQ(proxy.newMessage(nullptr), -1);
    EXPECT_STREQ(proxy.getErrorName(), "") << "the last error is none of D-Bus's";
    proxy.resetError();
    EXPECT_EQ(ask(proxy, "NoSuchMethod"), "-1 11 No such method");
    RemoteObject absent("com.example.Absent", peerPath, peerInterface, busType);
    EXPECT_EQ(ask(absent, "Take"),
              "-1 11 The name com.example.Absent was not provided by any .service files");
}

TEST_F(CallTest, CallsWithoutReplyAreWrittenAtOnceAndLeaveNoReply) {
    peer.reply("Ask", with("old"));
    peer.reply("Take");
    ASSERT_EQ(call("Ask"), 0);
    ASSERT_EQ(proxy.newMessage("Take"), 0);
    ASSERT_EQ(proxy.append(std::string(5'000'000, 'x').c_str()), 0); // more than a socket takes
    EXPECT_EQ(proxy.sendMessage(false, 1), 0);
    EXPECT_FALSE(dbus_connection_has_messages_to_send(proxy.getConnection()));
    ASSERT_TRUE(peer.waitForCalls("Take", 1));
    EXPECT_FALSE(peer.calls()[1].wantsReply);
    std::string text;
    EXPECT_EQ(outcome(proxy.getReplyValue(text)), noReply);
    EXPECT_EQ(outcome(proxy.sendMessage(false, -1)), notSent); // the message was used up
}

TEST_F(CallTest, TimeOutsAreKeptAndALateReplyIsNobodys) {
    peer.reply("Slow", with("late"), Milliseconds(400));
    peer.reply("Quick", with("mine"));
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(outcome(call("Slow", 100)).substr(0, 29), "-1 11 Did not receive a reply");
    EXPECT_GE(std::chrono::steady_clock::now() - begin, Milliseconds(100));
    EXPECT_EQ(call("Quick", 0x7fffffff), 0);
    EXPECT_EQ(call("Slow", -1), 0); // by now the first one's reply has come
    EXPECT_EQ(ask(proxy, "Quick"), "mine");
    EXPECT_EQ(outcome(call("Quick", -2)), "-1 11 Invalid time-out");
}

} // namespace Bluetooth::Test
