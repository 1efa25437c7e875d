// SPDX-License-Identifier: LGPL-2.1-or-later
#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

class DeviceVerbs : public KesbtTest {};

TEST_F(DeviceVerbs, AKnownDeviceIsListedAndShown) {
    EXPECT_EQ(run("devices"),
              (Result{0,
                      "ADDRESS            PAIRED  TRUSTED  CONNECTED  KIND         NAME\n"
                      "00:11:22:33:44:06  yes     yes      no         input-mouse  Desk Mouse\n",
                      ""}));
    const Json device = json("device "s + knownMouse);
    EXPECT_EQ(device["properties"]["Paired"], true);
    EXPECT_EQ(json("devices"), Json::array({device}));
    EXPECT_EQ(json("--adapter hci1 devices"), Json::array());
}

TEST_F(DeviceVerbs, CreateServicesAndRemove) {
    EXPECT_EQ(failure("device "s + headset),
              "hci0 does not know 00:11:22:33:44:01; see what it knows: kesbt --adapter hci0 "
              "devices, or make it "
              "known: kesbt --adapter hci0 create 00:11:22:33:44:01\n");
    const Json created = json("create "s + headset);
    EXPECT_EQ(created["properties"]["Name"], "Kestrine Headset");
    EXPECT_NE(failure("create "s + headset).find("Already Exists"), std::string::npos);
    EXPECT_EQ(errorsOf(*startAtTerminal("create "s + pinReceiver), 0),
              "Connecting to 00:11:22:33:44:04 on hci0 (Ctrl-C stops it)\n");

    const Json sink = json("services "s + headset + " 0x110b");
    ASSERT_EQ(sink.size(), 1U);
    EXPECT_EQ(sink[0]["uuids"][0], "0x110b");
    EXPECT_NE(run("services "s + headset).out.find("0x110b  Audio Sink"), std::string::npos);
    EXPECT_NE(failure("services "s + headset + " junk").find("Invalid arguments"),
              std::string::npos);

    EXPECT_EQ(run("remove "s + headset).out, "Removed 00:11:22:33:44:01 from hci0\n");
    failure("remove "s + headset);
    failure("device "s + headset);
}

TEST_F(DeviceVerbs, WhatIsInterruptedOrTakesTooLongIsCancelled) {
    const struct {
        std::string command;
        std::string doing;
        const char* method;
        const char* cancelling;
    } cases[] = {
        {"create 00:11:22:33:44:07", "creating 00:11:22:33:44:07; ", "CreateDevice",
         "CancelDeviceCreation"},
        {"pair 00:11:22:33:44:07", "pairing with 00:11:22:33:44:07; ", "CreatePairedDevice",
         "CancelDeviceCreation"},
        {"services 00:11:22:33:44:06", "reading the services of 00:11:22:33:44:06; ",
         "DiscoverServices", "CancelDiscovery"},
    };
    setTimeScale(20);
    for (const auto& [command, doing, method, cancelling] : cases) {
        const std::size_t cancelled = calls(cancelling);
        const std::string late = errorsOf(*start("--timeout 0.2 " + command));
        EXPECT_NE(late.find("time is over while " + doing + "m"), std::string::npos) << late;
        awaitCall(cancelling, cancelled + 1);
        const auto running = start(command);
        awaitCall(method, 2);
        running->signal(SIGINT);
        const std::string interrupted = errorsOf(*running);
        EXPECT_NE(
            interrupted.find("interrupted while " + doing + "repeat the command to try again\n"),
            std::string::npos)
            << interrupted;
        awaitCall(cancelling, cancelled + 2);
    }
    failure("device "s + unreachableLaptop);
}

TEST_F(DeviceVerbs, APropertyIsSetAndReadBack) {
    const std::string mouse = " "s + knownMouse + " ";
    const struct {
        const char* given;
        Json now;
    } rows[] = {{"trusted off", {{"Trusted", false}}},
                {"Blocked yes", {{"Blocked", true}}},
                {"Alias other", {{"Alias", "other"}}},
                {"alias  ", {{"Alias", "Desk Mouse"}}}}; // the device's own name again
    for (const auto& [given, now] : rows) {
        EXPECT_EQ(run("device set" + mouse + given).status, 0);
        const Json properties = json("device" + mouse.substr(0, mouse.size() - 1))["properties"];
        EXPECT_EQ(properties[now.begin().key()], now.begin().value());
    }
    EXPECT_EQ(
        failure("device set" + mouse + "Paired no"),
        "the daemon does not let Paired of 00:11:22:33:44:06 be set to \"no\"; see what can be "
        "set: kesbt device set --help\n");
    EXPECT_EQ(failure("device set" + mouse + "Trusted on " + headset, 2),
              "\"00:11:22:33:44:01\" is too much; see: kesbt device set --help\n");
    failure("device", 2);
}

TEST_F(DeviceVerbs, AudioIsConnectedShownAndDisconnected) {
    run("create "s + headset);
    const std::string seeMouse =
        "; see what it has: kesbt --adapter hci0 services 00:11:22:33:44:06\n";
    EXPECT_EQ(failure("audio status "s + knownMouse), "00:11:22:33:44:06 has no audio" + seeMouse);
    EXPECT_EQ(failure("volume up "s + knownMouse),
              "00:11:22:33:44:06 has no remote control" + seeMouse);
    EXPECT_EQ(failure("volume up "s + headset),
              "the remote control of 00:11:22:33:44:01 is not connected; connect it first: kesbt "
              "--adapter hci0 audio connect 00:11:22:33:44:01\n");

    const Json connected = json("audio connect "s + headset);
    EXPECT_EQ(connected["audio"]["State"], "connected");
    EXPECT_EQ(run("audio connect "s + headset).status, 0); // it is so already
    EXPECT_EQ(run("volume down "s + headset).out, "Volume down sent to 00:11:22:33:44:01\n");
    awaitCall("VolumeDown");
    EXPECT_EQ(json("audio disconnect "s + headset)["audio"]["State"], "disconnected");
    simulation.setDevice(headset, "Connectable", false);
    EXPECT_NE(failure("audio connect "s + headset).find("Connect Failed"), std::string::npos);
}

} // namespace Bluetooth::Test
