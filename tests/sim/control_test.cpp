#include "sim/sim_fixture.h"

namespace Bluetooth::Test {

namespace {

using ControlTest = SimTest;

TEST_F(ControlTest, TheNextCallFailsOnceOrWaits) {
    client->control("FailNext",
                    "('org.bluez.Adapter', 'ListDevices', 'org.example.Error.Made', 'up')");
    EXPECT_EQ(client->call(adapter, "Adapter.FindDevice", "('x',)"),
              "error org.bluez.Error.DoesNotExist: Does Not Exist");
    EXPECT_EQ(client->call(adapter, "Adapter.ListDevices"), "error org.example.Error.Made: up");
    EXPECT_EQ(client->call(adapter, "Adapter.ListDevices"), "reply []");
    client->control("DelayNext", "('org.bluez.Adapter', 'ListDevices', uint32 30)");
    client->start("late", adapter, "Adapter.ListDevices");
    client->start("prompt", adapter, "Adapter.ListDevices");
    EXPECT_EQ(client->until("reply late"), (Lines{"reply prompt []", "reply late []"}));
}

TEST_F(ControlTest, AnySignalCanBeEmittedAndComesBeforeTheAnswer) {
    const auto emit = [&](const std::string& arguments) {
        client->call("", "com.kestrine.bluetooth.Sim.EmitSignal",
                     "(objectpath '" + adapter + "', 'org.bluez.Adapter', " + arguments + ")");
        return client->taken();
    };
    EXPECT_EQ(emit("'DeviceFound', <(uint32 5, [true])>"), (Lines{"hci0 DeviceFound 5 [true]"}));
    EXPECT_EQ(emit("'Made.Up', <@av []>").size(), 0U); // refused: not a member name
    EXPECT_EQ(emit("'AdapterAdded', <@av []>"), (Lines{"hci0 AdapterAdded"}));
    EXPECT_EQ(emit("'PropertyChanged', <'alone'>"), (Lines{"hci0 PropertyChanged 'alone'"}));
}

TEST_F(ControlTest, CallsAreRecordedInOrder) {
    client->control("ClearCalls");
    client->start("set", adapter, "Adapter.SetProperty", "('Pairable', <true>)");
    client->start("find", "/", "Manager.FindAdapter", "('hci1',)");
    EXPECT_EQ(client->control("GetCalls"),
              "reply [('hci0', 'org.bluez.Adapter', 'SetProperty', [<'Pairable'>, <<true>>]), "
              "('/', 'org.bluez.Manager', 'FindAdapter', [<'hci1'>])]");
}

TEST_F(ControlTest, WrongSettingsChangeNothing) {
    const auto add = [&](const std::string& settings) {
        return client->call("", "com.kestrine.bluetooth.Sim.AddDevice",
                            "('00:11:22:33:44:55', {" + settings + "})");
    };
    const std::string failed = "error com.kestrine.bluetooth.Sim.Error.Failed: ";
    EXPECT_EQ(add("'Nothing': <'x'>"), failed + "Nothing: there is no such key");
    EXPECT_EQ(add("'Passkey': <'1000000'>"),
              failed + "Passkey: \"1000000\" is not a number from 0 to 999999");
    EXPECT_EQ(add("'Behaviour': <'Magic'>"), failed + "Behaviour: \"Magic\" is not a behaviour");
    addDevice(phone);
    EXPECT_EQ(add("'Name': <'x'>"), failed + "there is a device 00:11:22:33:44:55 already");
}

TEST_F(ControlTest, TheDaemonKnowsNothingOfIt) {
    client->start("x", "/com/kestrine/bluetooth/Sim", "Manager.GetProperties");
    EXPECT_EQ(client->until("error x").back().substr(0, 48),
              "error x org.freedesktop.DBus.Error.UnknownObject");
}

} // namespace

} // namespace Bluetooth::Test
