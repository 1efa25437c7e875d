// SPDX-License-Identifier: LGPL-2.1-or-later
// The verbs on the scanner service, with the real service on a session bus of the test's own.

#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

class ScanVerbs : public KesbtTest {
protected:
    PrivateBus session{PrivateBus::Kind::Session, SESSION_BUS_CONFIGURATION};
};

TEST_F(ScanVerbs, TwoProgramsShareOneScan) {
    EXPECT_EQ(run("scan stop"), (Result{0, "No scan is running on hci0\n", ""}));
    const auto watch = start("scan watch --json"); // the bus starts the service
    const Json found = awaitEvent(*watch, "address", pinReceiver);
    EXPECT_EQ(found["properties"]["RSSI"], -70);

    const Json list = json("scan list");
    ASSERT_FALSE(list.empty());
    EXPECT_EQ(list[0]["address"], headset);
    EXPECT_NE(run("scan list").out.find("00:11:22:33:44:04  -70 dBm  0x001f00  GPS Receiver"),
              std::string::npos);
    EXPECT_EQ(calls("StartDiscovery"), 1U);

    simulation.setDevice(pinReceiver, "RSSI", "-20");
    while (awaitEvent(*watch, "event", "changed")["address"] != pinReceiver && !HasFailure()) {
    }
    watch->signal(SIGINT);
    EXPECT_EQ(watch->finish().status, 0);
    EXPECT_EQ(run("scan stop").out, "Stopped the scan on hci0\n");
    awaitCall("StopDiscovery");
}

TEST_F(ScanVerbs, WatchingOutlastsARestartOfTheDaemonAndEndsWithTheAdapter) {
    ChildProcess watch({"sh", "-c", "exec " KESBT " scan watch 2>&1"},
                       ChildProcess::Output::Capture);
    const auto await = [&watch](const std::string& beginning) {
        std::string line = watch.readLine();
        while (line.rfind(beginning, 0) != 0 && !line.empty())
            line = watch.readLine();
        EXPECT_FALSE(line.empty()) << beginning;
    };
    await("found     00:11:22:33:44:04");
    simulation.control("DropName");
    await("bluetoothd has left the system bus; waiting for it (Ctrl-C ends it)");
    simulation.control("Restart");
    await("bluetoothd is back, the scan on hci0 goes on");
    simulation.setDevice(pinReceiver, "RSSI", "-20");
    await("changed   00:11:22:33:44:04");
    run("adapter set Powered off");
    await("hci0 is off; switch it on: kesbt --adapter hci0 adapter set Powered true");
    EXPECT_EQ(watch.finish().status, 1);
}

class ScanVerbsAlone : public KesbtTest {
protected:
    PrivateBus session{PrivateBus::Kind::Session};
};

TEST_F(ScanVerbsAlone, WithoutTheServiceTheLineSaysSo) {
    for (const char* verb : {"list", "watch"})
        EXPECT_EQ(failure("scan "s + verb),
                  "the scanner service is not running; start it: kesbt-scannerd\n");
    session.kill();
    EXPECT_EQ(failure("scan list"), "the session bus cannot be reached; log in, or try: "
                                    "dbus-run-session -- kesbt scan list\n");
}

} // namespace Bluetooth::Test
