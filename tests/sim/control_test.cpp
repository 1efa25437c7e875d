#include "sim/sim_test.h"

namespace Bluetooth::Test {

namespace {

using ControlTest = SimTest;

TEST_F(ControlTest, TheNextCallFailsOnceOrWaits) {
    simulation.failNext("org.bluez.Adapter", "ListDevices", "org.example.Error.Made", "up");
    EXPECT_EQ(client->call("Adapter.FindDevice", "('x',)"), "error DoesNotExist: Does Not Exist");
    EXPECT_EQ(client->call("Adapter.ListDevices"), "error org.example.Error.Made: up");
    EXPECT_EQ(client->call("Adapter.ListDevices"), "reply []");
    simulation.delayNext("org.bluez.Adapter", "ListDevices", 30);
    client->start("late", "Adapter.ListDevices");
    EXPECT_EQ(client->trace("Adapter.ListDevices", "()", "reply late"),
              lines("reply call []", "reply late []"));
}

TEST_F(ControlTest, AnySignalCanBeEmittedAndComesBeforeTheAnswer) {
    const auto emit = [&](const std::string& arguments) {
        client->call("com.kestrine.bluetooth.Sim.EmitSignal",
                     "(objectpath '" + base + "hci0', 'org.bluez.Adapter', " + arguments + ")");
        return client->taken();
    };
    EXPECT_EQ(emit("'DeviceFound', <(uint32 5, [true])>"), lines("hci0 DeviceFound 5 [true]"));
    EXPECT_EQ(emit("'Made.Up', <@av []>"), Texts{}); // refused: not a member name
    EXPECT_EQ(emit("'AdapterAdded', <@av []>"), lines("hci0 AdapterAdded"));
    EXPECT_EQ(emit("'PropertyChanged', <'alone'>"), lines("hci0 PropertyChanged 'alone'"));
}

TEST_F(ControlTest, CallsAreRecordedInOrder) {
    client->control("ClearCalls");
    client->start("set", "Adapter.SetProperty", "('Pairable', <true>)");
    client->start("find", "Manager.FindAdapter", "('hci1',)");
    EXPECT_EQ(client->control("GetCalls"),
              "reply [('hci0', 'org.bluez.Adapter', 'SetProperty', [<'Pairable'>, <<true>>]), "
              "('/', 'org.bluez.Manager', 'FindAdapter', [<'hci1'>])]");
}

TEST(ScenarioTest, WhatIsSetShowsInTheProperties) {
    const Simulation simulation(
        "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\nClass=256\nPowered=false\n"
        "Pairable=false\nDiscoverableTimeout=7\nPairableTimeout=8\n"
        "[Device 00:11:22:33:44:55]\nAdapter=hci0\nPaired=true\n"
        "Trusted=true\nBlocked=true\nAlias=Mine\n");
    SimClient client;
    client.base();
    const auto expectIn = [](const std::string& properties, const Texts& entries) {
        for (const std::string& entry : entries)
            EXPECT_NE(properties.find(entry), std::string::npos) << entry << ": " << properties;
    };
    expectIn(client.call("Device.GetProperties"),
             {"'Paired': <true>", "'Trusted': <true>", "'Blocked': <true>", "'Alias': <'Mine'>"});
    expectIn(client.call("Adapter.GetProperties"),
             {"'Powered': <false>", "'Pairable': <false>", "'DiscoverableTimeout': <7>",
              "'PairableTimeout': <8>"});
}

TEST_F(ControlTest, WrongSettingsChangeNothing) {
    const auto refused = [&](const std::string& settings) {
        return client->call("com.kestrine.bluetooth.Sim.AddDevice",
                            "('00:11:22:33:44:55', {" + settings + "})");
    };
    const std::string failed = "error com.kestrine.bluetooth.Sim.Error.Failed: ";
    EXPECT_EQ(refused("'Nothing': <'x'>"), failed + "Nothing: there is no such key");
    EXPECT_EQ(refused("'Passkey': <'1000000'>"),
              failed + "Passkey: \"1000000\" is not a number from 0 to 999999");
    EXPECT_EQ(refused("'Behaviour': <'Magic'>"),
              failed + "Behaviour: \"Magic\" is not a behaviour");
    add();
    EXPECT_EQ(refused("'Name': <'x'>"), failed + "there is a device 00:11:22:33:44:55 already");
}

TEST_F(ControlTest, AgentsCanBeCalledWithAnything) {
    registerAgent();
    client->agentAnswers("RequestPinCode", "('1234',)");
    client->agentAnswers("Nonsense", "!org.freedesktop.DBus.Error.UnknownMethod");
    EXPECT_EQ(client->control("CallAgent", "('hci0', '', 'RequestPinCode', <(int16 5, 'x')>)"),
              "reply '' '' [<'1234'>]");
    EXPECT_EQ(client->taken().back(), "agent RequestPinCode 5 'x'");
    EXPECT_EQ(client->control("CallAgent", "('hci0', 'org.bluez.Other', 'Nonsense', <@av []>)"),
              "reply 'org.freedesktop.DBus.Error.UnknownMethod' 'said no' []");
}

} // namespace

} // namespace Bluetooth::Test
