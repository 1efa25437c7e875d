// SPDX-License-Identifier: LGPL-2.1-or-later
// Long use leaves nothing behind. scripts/soak.sh runs these at full length.

#include "fault/soak.h"
#include "support/peer_test.h"

namespace Bluetooth::Test {

namespace {

constexpr int batch = 1000;
int delivered = 0; // of the receive thread

void onFound(RemoteObject*, const char*, const Dict* properties) {
    if (properties->size() == 2 && ++delivered % batch == 0)
        seen().add("a batch");
}

} // namespace

class SoakTest : public LoopTest {
protected:
    SoakTest() { peer.stopRecording(); }

    void makeCalls(int count) {
        for (int i = 0; i < count; ++i) {
            Dict dict;
            RemoteObject object(peerName, peerPath, peerInterface, busType);
            ASSERT_EQ(call(object, "GetProperties"), 0);
            ASSERT_EQ(object.getReplyValue(dict), 0);
            ASSERT_EQ(call(object, "Fail"), -1);
        }
    }

    void emitSignals(int count) {
        for (; count > 0; count -= batch) {
            seen().clear();
            for (int i = 0; i < batch; ++i)
                peer.emit(peerPath, peerInterface, "Found", [](Writer& w) {
                    w("00:11:22:33:44:55").dict("sv", [](Writer& d) {
                        d.entry("Name", Var{"a name that is longer than a short string"});
                        d.entry("RSSI", Var{std::int16_t{-60}});
                    });
                });
            ASSERT_TRUE(seen().waitFor(1)); // else the inbox grows, as it should
        }
    }
};

TEST_F(SoakTest, CallsLeaveMemoryAndDescriptorsFlat) {
    peer.reply("GetProperties", [](Writer& w) {
        w.dict("sv", [](Writer& d) { d.entry("Name", Var{"x"}).entry("Class", Var{360u}); });
    });
    makeCalls(200);
    const Holdings before;
    makeCalls(soakCount(50'000)); // two calls each
    expectNoGrowth(before);
}

TEST_F(SoakTest, SignalsLeaveMemoryAndDescriptorsFlat) {
    ASSERT_EQ(proxy.setSignalHandlerStringDict("Found", onFound), 0);
    const RunningLoop running(loop);
    emitSignals(5 * batch);
    const Holdings before;
    emitSignals(soakCount(1'000'000));
    expectNoGrowth(before);
}

} // namespace Bluetooth::Test
