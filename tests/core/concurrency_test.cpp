// SPDX-License-Identifier: LGPL-2.1-or-later
// Many threads, one connection: no reply and no signal is lost, and no call waits for another's.

#include "support/peer_test.h"

#include <algorithm>
#include <atomic>
#include <string>
#include <thread>

namespace Bluetooth::Test {

namespace {

using Clock = std::chrono::steady_clock;

/// Answers with the argument.
MessagePtr echo(DBusMessage* call) {
    const char* text = "";
    dbus_message_get_args(call, nullptr, DBUS_TYPE_STRING, &text, DBUS_TYPE_INVALID);
    return replyTo(call, with(text));
}

struct Echoes {
    int failures = 0; ///< failed, or another call's reply
    std::vector<Clock::duration> times;

    Clock::duration median() {
        std::nth_element(times.begin(), times.begin() + static_cast<long>(times.size() / 2),
                         times.end());
        return times[times.size() / 2];
    }
    Clock::duration longest() const { return *std::max_element(times.begin(), times.end()); }
};

bool callEcho(RemoteObject& proxy, const std::string& text) {
    std::string answer;
    return proxy.newMessage("Echo") == 0 && proxy.append(text.c_str()) == 0 &&
           proxy.sendMessage(true, -1) == 0 && proxy.getReplyValue(answer) == 0 && answer == text;
}

Echoes callEchoes(int count, const std::string& name) {
    RemoteObject proxy(peerName, peerPath, peerInterface, DBUS_BUS_SESSION);
    Echoes result;
    for (int i = 0; i < count; ++i) {
        const auto begin = Clock::now();
        if (!callEcho(proxy, name + std::to_string(i)))
            ++result.failures;
        result.times.push_back(Clock::now() - begin);
    }
    return result;
}

/// What the callback of the numbered signals finds.
struct {
    std::atomic<int> next{0};
    std::atomic<int> outOfOrder{0};
    std::atomic<int> failedCalls{0};
} numbers;

void onNumber(RemoteObject*, const char* text) {
    static auto& caller =
        *new RemoteObject(peerName, peerPath, peerInterface, DBUS_BUS_SESSION); // outlives the test
    if (std::stoi(text) != numbers.next)
        ++numbers.outOfOrder;
    if (!callEcho(caller, text))
        ++numbers.failedCalls;
    ++numbers.next;
}

} // namespace

class ConcurrencyTest : public LoopTest {
protected:
    ConcurrencyTest() {
        peer.handle("Echo", echo);
        peer.stopRecording();
    }
};

TEST_F(ConcurrencyTest, NoReplyAndNoSignalIsLostWhenFourThreadsCallAndCallbacksCallBack) {
    constexpr int callsPerThread = isSanitized ? 1500 : 25000;
    constexpr int signalsPerBurst = 10; // every 5 ms: 2,000 a second
    ASSERT_EQ(proxy.setSignalHandlerString("Number", onNumber), 0);
    RawPeer source(bus.address());
    const RunningLoop running(loop);

    Latch callsDone;
    int emitted = 0;
    std::thread emitter([&] {
        do {
            for (int i = 0; i < signalsPerBurst; ++i, ++emitted)
                source.emit(peerPath, peerInterface, "Number", with(std::to_string(emitted)));
        } while (!callsDone.wait(Milliseconds(5)));
    });
    inThreads(4, [](int caller) {
        const Echoes echoes = callEchoes(callsPerThread, std::to_string(caller) + "-");
        EXPECT_EQ(echoes.failures, 0);
        EXPECT_LT(echoes.longest(), std::chrono::seconds(1));
    });
    callsDone.open();
    emitter.join();

    auto deadline = Clock::now() + patience; // for the next signal: a slow host has thousands left
    for (int last = 0; last < emitted && Clock::now() < deadline; callEchoes(1, "wait")) {
        if (numbers.next != last)
            deadline = Clock::now() + patience;
        last = numbers.next;
    }
    EXPECT_EQ(numbers.next, emitted);
    EXPECT_EQ(numbers.outOfOrder, 0);
    EXPECT_EQ(numbers.failedCalls, 0);
}

TEST_F(ConcurrencyTest, ASlowCallDelaysNeitherOtherCallsNorTheirTimeOuts) {
    for (const bool withLoop : {false, true}) {
        peer.reply("Slow", {}, std::chrono::seconds(3));
        peer.neverReply("Never");
        const auto receiving = withLoop ? std::make_unique<RunningLoop>(loop) : nullptr;
        const int count = isSanitized ? 200 : 500;
        Clock::duration alone = callEchoes(count, "alone").median();

        auto slow = std::async(std::launch::async, [this] { return call("Slow"); });
        Echoes meanwhile = callEchoes(count, "meanwhile");
        EXPECT_EQ(meanwhile.failures, 0);
        EXPECT_LT(meanwhile.median(), std::max<Clock::duration>(5 * alone, Milliseconds(3)));

        RemoteObject other(peerName, peerPath, peerInterface, busType);
        const auto begin = Clock::now();
        EXPECT_EQ(call(other, "Never", 200), -1);
        const auto took = Clock::now() - begin;
        EXPECT_GE(took, Milliseconds(200));
        EXPECT_LT(took, Milliseconds(1200));
        if (!isSanitized) {
            EXPECT_EQ(slow.wait_for(Milliseconds(0)), std::future_status::timeout)
                << "all of that was during the slow call";
        }
        EXPECT_EQ(slow.get(), 0);
    }
}

#ifdef KESBLUETOOTH_CHECK_THREADS
TEST_F(ConcurrencyTest, ADebugBuildEndsAProgramInWhichTwoThreadsUseAProxyAtOnce) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    peer.neverReply("Never");
    EXPECT_DEATH(
        {
            std::thread other([this] { call("Never"); });
            call("Never");
            other.join();
        },
        "two threads use a proxy at once: /com/example/peer");
}
#endif

} // namespace Bluetooth::Test
