// SPDX-License-Identifier: LGPL-2.1-or-later
#include "kesbt/kesbt_test.h"

#include <bluetooth/audio_sink.h>

#include <csignal>
#include <filesystem>

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

TEST_F(DeviceVerbs, ADeviceIsConnectedAndDisconnected) {
    EXPECT_EQ(json("input connect "s + knownMouse)["input"]["Connected"], true);
    EXPECT_EQ(json("device "s + knownMouse)["properties"]["Connected"], true);
    EXPECT_EQ(run("disconnect "s + knownMouse).out,
              "00:11:22:33:44:06 is disconnected from hci0\n");
    EXPECT_EQ(json("device "s + knownMouse)["properties"]["Connected"], false);
    EXPECT_EQ(run("disconnect "s + knownMouse).status, 0); // it is so already
    EXPECT_EQ(calls("Disconnect"), 1U);
    run("create "s + phone);
    EXPECT_EQ(
        failure("network connect "s + phone),
        "cannot connect the network of 00:11:22:33:44:03: this bluetoothd takes no service for "
        "it, as that of BlueZ 4.101; use another version of BlueZ 4\n");
}

TEST_F(DeviceVerbs, ASerialPortIsHeldUntilItsProgramEnds) {
    const std::string receiver = pinReceiver;
    run("create " + receiver);
    auto serial = start("serial connect " + receiver);
    const std::string terminal = serial->readLine();
    EXPECT_TRUE(std::filesystem::exists(terminal)) << terminal;
    EXPECT_EQ(failure("serial disconnect " + receiver + " " + terminal),
              "cannot disconnect " + terminal +
                  ": Operation Not Authorized; only the program that began it can do this\n");
    serial->signal(SIGINT);
    EXPECT_EQ(errorsOf(*serial, 0), "");
    EXPECT_FALSE(std::filesystem::exists(terminal));
    EXPECT_EQ(failure("serial connect " + receiver + " dun"),
              receiver + " has no \"dun\"; see what it has: kesbt --adapter hci0 services " +
                  receiver + "\n");
    EXPECT_EQ(failure("serial disconnect " + receiver + " /dev/none"),
              "\"/dev/none\" is no terminal of " + receiver +
                  "; kesbt serial connect tells it when it connects one\n");
    EXPECT_EQ(failure("serial connect "s + knownMouse).substr(0, 33),
              "00:11:22:33:44:06 has no serial p");

    serial = start("serial connect " + receiver);
    serial->readLine();
    simulation.control("DropLink", with("hci0", pinReceiver));
    EXPECT_EQ(errorsOf(*serial), receiver +
                                     " has ended the connection; make sure that it is within "
                                     "reach and repeat the command\n");
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
    EXPECT_NE(failure("headset play "s + headset).find("set SCORouting=PCM in"), std::string::npos);

    // Connected by the headset alone: the sink is missing.
    const std::string path = json("device "s + headset)["path"];
    const auto dropSink = [&] {
        AudioSink(path.c_str()).disconnect();
        while (json("audio status "s + headset)["sink"]["Connected"] == true) {
        }
        EXPECT_EQ(json("audio status "s + headset)["audio"]["State"], "connected");
    };
    dropSink();
    EXPECT_EQ(json("audio connect "s + headset)["sink"]["Connected"], true);
    dropSink();
    simulation.failNext("org.bluez.AudioSink", "Connect", "org.bluez.Error.Failed",
                        "Stream setup failed");
    EXPECT_NE(failure("audio connect "s + headset)
                  .find("cannot connect the sink of 00:11:22:33:44:01: Stream setup failed; "),
              std::string::npos);
    run("audio connect "s + headset);
    EXPECT_EQ(run("volume down "s + headset).out, "Volume down sent to 00:11:22:33:44:01\n");
    awaitCall("VolumeDown");
    EXPECT_EQ(json("audio disconnect "s + headset)["audio"]["State"], "disconnected");
    simulation.setDevice(headset, "Connectable", false);
    EXPECT_NE(failure("audio connect "s + headset).find("Connect Failed"), std::string::npos);
}

} // namespace Bluetooth::Test
