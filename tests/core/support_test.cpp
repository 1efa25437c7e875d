// What the other tests rely on.

#include "support/core_test.h"
#include "support/stdout_capture.h"

#include "core/log.h"

#include <iostream>

namespace Bluetooth::Test {

class SupportTest : public CoreTest {};

TEST_F(SupportTest, PeerAnswersAsToldAndRecordsWhatItGot) {
    peer.reply("Greet", [](Writer& w) { w("hello"); });
    std::string text;
    ASSERT_EQ(proxy.newMessage("Greet"), 0);
    ASSERT_EQ(proxy.append("you"), 0);
    ASSERT_EQ(proxy.sendMessage(true, -1), 0);
    EXPECT_EQ(proxy.getReplyValue(text), 0);
    EXPECT_EQ(text, "hello");
    EXPECT_EQ(peer.callTexts(), std::vector<std::string>{"Greet s:you"});

    RawPeer monitor(bus.address());
    monitor.becomeMonitor();
    EXPECT_EQ(call("Nothing"), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "No such method");
    EXPECT_TRUE(monitor.waitForCalls("Nothing", 1));
}

TEST_F(SupportTest, LogLinesAndOutputAreSeen) {
    logError(KES_HERE, "%s is %d", "this", 1);
    EXPECT_EQ(log.take(), std::vector<std::string>{"support_test.cpp this is 1"});

    StdoutCapture output;
    std::cout << "one\ntwo\n" << std::flush;
    EXPECT_EQ(output.readLine(), "one");
    EXPECT_EQ(output.take(), "two\n");
}

TEST_F(SupportTest, NamesAreWaitedFor) {
    RawPeer other(bus.address());
    EXPECT_TRUE(other.waitForOwner(peerName, true));
    EXPECT_FALSE(other.waitForOwner(peerName, false, Milliseconds(1)));
    peer.disown(peerName);
    EXPECT_TRUE(other.waitForOwner(peerName, false));
}

} // namespace Bluetooth::Test
