#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

class DeviceVerbs : public KesbtTest {};

TEST_F(DeviceVerbs, AKnownDeviceIsListedAndShown) {
    EXPECT_EQ(run({"devices"}),
              (Result{0,
                      "ADDRESS            PAIRED  TRUSTED  CONNECTED  KIND         NAME\n"
                      "00:11:22:33:44:06  yes     yes      no         input-mouse  Desk Mouse\n",
                      ""}));
    const Json device = json({"device", knownMouse});
    EXPECT_EQ(device["properties"]["Paired"], true);
    EXPECT_EQ(json({"devices"}), Json::array({device}));
    EXPECT_EQ(json({"--adapter", "hci1", "devices"}), Json::array());
}

TEST_F(DeviceVerbs, CreateServicesAndRemove) {
    EXPECT_EQ(failure({"device", headset}),
              "hci0 does not know 00:11:22:33:44:01; see what it knows: kesbt devices, or make it "
              "known: kesbt create 00:11:22:33:44:01\n");
    const Json created = json({"create", headset});
    EXPECT_EQ(created["properties"]["Name"], "Kestrine Headset");
    EXPECT_NE(failure({"create", headset}).find("Already Exists"), std::string::npos);

    const Json sink = json({"services", headset, "0x110b"});
    ASSERT_EQ(sink.size(), 1U);
    EXPECT_EQ(sink[0]["uuids"][0], "0x110b");
    EXPECT_NE(run({"services", headset}).out.find("0x110b  Audio Sink"), std::string::npos);
    EXPECT_NE(failure({"services", headset, "junk"}).find("Invalid arguments"), std::string::npos);

    EXPECT_EQ(run({"remove", headset}).out, "Removed 00:11:22:33:44:01 from hci0\n");
    failure({"remove", headset});
    failure({"device", headset});
}

TEST_F(DeviceVerbs, AnUnreachableDeviceIsNotCreated) {
    const std::string beginning = "cannot create 00:11:22:33:44:07 on hci0: ";
    EXPECT_EQ(failure({"create", unreachableLaptop}),
              beginning + "Host is down; make sure that the device is on and within reach\n");
    run({"adapter", "set", "Powered", "off"});
    EXPECT_EQ(failure({"create", unreachableLaptop}),
              beginning + "Resource Not Ready; the adapter is off, switch it on: kesbt adapter set "
                          "Powered true\n");
}

TEST_F(DeviceVerbs, WhatIsInterruptedOrTakesTooLongIsCancelled) {
    const struct {
        Texts command;
        std::string doing;
        const char* method;
        const char* cancelling;
    } cases[] = {
        {{"create", unreachableLaptop}, "creating ", "CreateDevice", "CancelDeviceCreation"},
        {{"pair", unreachableLaptop},
         "pairing with ",
         "CreatePairedDevice",
         "CancelDeviceCreation"},
        {{"services", knownMouse},
         "reading the services of ",
         "DiscoverServices",
         "CancelDiscovery"},
    };
    setTimeScale(20);
    for (const auto& [command, doing, method, cancelling] : cases) {
        const std::size_t cancelled = calls(cancelling);
        Texts limited = {"--timeout", "0.2"};
        limited.insert(limited.end(), command.begin(), command.end());
        const Result late = run(limited);
        EXPECT_EQ(late.status, 1);
        EXPECT_NE(late.err.find("time is over while " + doing + command[1] + "; m"),
                  std::string::npos)
            << late;
        awaitCall(cancelling, cancelled + 1);
        const auto running = start(command);
        awaitCall(method, 2);
        running->signal(SIGINT);
        const Result interrupted = running->finish();
        EXPECT_EQ(interrupted.status, 1);
        EXPECT_NE(interrupted.err.find("interrupted while " + doing + command[1] +
                                       "; repeat the command to try again\n"),
                  std::string::npos)
            << interrupted;
        awaitCall(cancelling, cancelled + 2);
    }
    failure({"device", unreachableLaptop});
}

TEST_F(DeviceVerbs, AudioIsConnectedShownAndDisconnected) {
    run({"create", headset});
    const std::string seeMouse = "; see what it has: kesbt services 00:11:22:33:44:06\n";
    EXPECT_EQ(failure({"audio", "status", knownMouse}),
              "00:11:22:33:44:06 has no audio" + seeMouse);
    EXPECT_EQ(failure({"volume", "up", knownMouse}),
              "00:11:22:33:44:06 has no remote control" + seeMouse);
    EXPECT_EQ(failure({"volume", "up", headset}),
              "the remote control of 00:11:22:33:44:01 is not connected; connect it first: kesbt "
              "audio connect 00:11:22:33:44:01\n");

    const Json connected = json({"audio", "connect", headset});
    EXPECT_EQ(connected["audio"]["State"], "connected");
    EXPECT_EQ(run({"audio", "connect", headset}).status, 0); // it is so already
    EXPECT_EQ(run({"volume", "down", headset}).out, "Volume down sent to 00:11:22:33:44:01\n");
    awaitCall("VolumeDown");
    EXPECT_EQ(json({"audio", "disconnect", headset})["audio"]["State"], "disconnected");
    simulation.setDevice(headset, "Connectable", false);
    EXPECT_NE(failure({"audio", "connect", headset}).find("Connect Failed"), std::string::npos);
}

} // namespace Bluetooth::Test
