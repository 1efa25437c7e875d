// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

namespace Bluetooth::Test {

using ControlTest = SimTest;

/// No arguments: an empty tuple cannot be sent.
const Writer::Build nothing = [](Writer& w) { w.variant("av", [](Writer& v) { v.array("v"); }); };

TEST_F(ControlTest, TheNextCallFailsOnceOrWaits) {
    simulation.failNext("org.bluez.Adapter", "ListDevices", "org.example.Error.Made", "up");
    EXPECT_EQ(call({"Adapter.FindDevice", "x"}), "error DoesNotExist: Does Not Exist");
    EXPECT_EQ(call("Adapter.ListDevices"), "error org.example.Error.Made: up");
    EXPECT_EQ(call("Adapter.ListDevices"), "a()");
    simulation.delayNext("org.bluez.Adapter", "ListDevices", 30);
    start("Adapter.ListDevices");
    start({"Manager.FindAdapter", "hci1"});
    EXPECT_EQ(until("answer ListDevices"),
              lines("answer FindAdapter o:hci1", "answer ListDevices a()"));
}

TEST_F(ControlTest, AnySignalCanBeEmittedAndComesBeforeTheAnswer) {
    const auto emit = [&](const char* member, const auto& arguments) {
        call({"com.kestrine.bluetooth.Sim.EmitSignal", Path{base + "hci0"}, "org.bluez.Adapter",
              member, arguments});
        return taken();
    };
    const auto tuple = [](Writer& w) {
        w.variant("(uab)",
                  [](Writer& v) { v.structure([](Writer& s) { s(5U).array("b", with(true)); }); });
    };
    EXPECT_EQ(emit("DeviceFound", tuple), lines("hci0 DeviceFound u:5 a(b:1)"));
    EXPECT_EQ(emit("Made.Up", nothing), Texts{}); // refused: not a member name
    EXPECT_EQ(emit("AdapterAdded", nothing), lines("hci0 AdapterAdded"));
    EXPECT_EQ(emit("PropertyChanged", Var{"alone"}), lines("hci0 PropertyChanged s:alone"));
}

TEST_F(ControlTest, CallsAreRecordedInOrder) {
    control("ClearCalls");
    start({"Adapter.SetProperty", "Pairable", Var{true}});
    start({"Manager.FindAdapter", "hci1"});
    EXPECT_EQ(control("GetCalls"),
              "a(r(o:hci0 s:org.bluez.Adapter s:SetProperty a(v(s:Pairable) v(v(b:1)))) "
              "r(o:/ s:org.bluez.Manager s:FindAdapter a(v(s:hci1))))");
}

TEST(ScenarioTest, WhatIsSetShowsInTheProperties) {
    const Simulation simulation(
        "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\nClass=256\nPowered=false\n"
        "Pairable=false\nDiscoverableTimeout=7\nPairableTimeout=8\n"
        "[Device 00:11:22:33:44:55]\nAdapter=hci0\nPaired=true\n"
        "Trusted=true\nBlocked=true\nAlias=Mine\n");
    SimClient client;
    const auto expectIn = [](const std::string& properties, const Texts& entries) {
        for (const std::string& entry : entries)
            EXPECT_NE(properties.find("(s:" + entry + ")"), std::string::npos)
                << entry << ": " << properties;
    };
    expectIn(client.call("Device.GetProperties"),
             {"Paired v(b:1)", "Trusted v(b:1)", "Blocked v(b:1)", "Alias v(s:Mine)"});
    expectIn(client.call("Adapter.GetProperties"),
             {"Powered v(b:0)", "Pairable v(b:0)", "DiscoverableTimeout v(u:7)",
              "PairableTimeout v(u:8)"});
}

TEST_F(ControlTest, WrongSettingsChangeNothing) {
    const auto refused = [&](const char* key, const char* value) {
        return call({"com.kestrine.bluetooth.Sim.AddDevice", newDevice, Settings{{key, value}}});
    };
    const std::string failed = "error com.kestrine.bluetooth.Sim.Error.Failed: ";
    EXPECT_EQ(refused("Nothing", "x"), failed + "Nothing: there is no such key");
    EXPECT_EQ(refused("Passkey", "1000000"),
              failed + "Passkey: \"1000000\" is not a number from 0 to 999999");
    EXPECT_EQ(refused("Behaviour", "Magic"), failed + "Behaviour: \"Magic\" is not a behaviour");
    add();
    EXPECT_EQ(refused("Name", "x"), failed + "there is a device 00:11:22:33:44:55 already");
}

TEST_F(ControlTest, AgentsCanBeCalledWithAnything) {
    registerAgent();
    peer().reply("RequestPinCode", with("1234"));
    peer().replyError("Nonsense", DBUS_ERROR_UNKNOWN_METHOD, "said no");
    const auto tuple = [](Writer& w) {
        w.variant("(ns)", [](Writer& v) { v.structure(with(std::int16_t{5}, "x")); });
    };
    EXPECT_EQ(control({"CallAgent", "hci0", "", "RequestPinCode", tuple}), "s: s: a(v(s:1234))");
    EXPECT_EQ(taken().back(), "agent RequestPinCode n:5 s:x");
    EXPECT_EQ(control({"CallAgent", "hci0", "org.bluez.Other", "Nonsense", nothing}),
              "s:org.freedesktop.DBus.Error.UnknownMethod s:said no a()");
}

} // namespace Bluetooth::Test
