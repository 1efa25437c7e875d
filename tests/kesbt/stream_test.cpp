// SPDX-License-Identifier: LGPL-2.1-or-later
// The verbs that print until they are interrupted: discover and monitor.

#include "kesbt/kesbt_test.h"

#include <csignal>
#include <set>

namespace Bluetooth::Test {

class Streams : public KesbtTest {};

TEST_F(Streams, DiscoverTellsWhatAppearsChangesAndVanishes) {
    const auto discover = start("discover --json");
    std::set<std::string> found;
    while (found.size() < 8)
        found.insert(awaitEvent(*discover, "event", "found")["address"].get<std::string>());
    EXPECT_EQ(adapterProperties()["Discovering"], true);

    const Json vanished = awaitEvent(*discover, "event", "vanished");
    EXPECT_EQ(vanished["address"], vanishingSpeaker);
    EXPECT_EQ(vanished["properties"]["Name"], "Passing Speaker");

    simulation.setDevice(pinReceiver, "RSSI", "-20");
    const Json changed = awaitEvent(*discover, "address", pinReceiver);
    EXPECT_EQ(changed["event"], "changed");
    EXPECT_EQ(changed["changed"], Json::array({"RSSI"}));
    EXPECT_EQ(changed["properties"]["RSSI"], -20);

    discover->signal(SIGINT);
    EXPECT_EQ(errorsOf(*discover, 0), "");
    EXPECT_EQ(calls("StopDiscovery"), 1U);
    EXPECT_EQ(adapterProperties()["Discovering"], false);
}

TEST_F(Streams, DiscoverFailsWhenItCannotGoOn) {
    auto discover = start("discover");
    EXPECT_NE(discover->readLine(), "");
    run("adapter set Powered off");
    EXPECT_EQ(errorsOf(*discover),
              "hci0 is off; switch it on: kesbt --adapter hci0 adapter set Powered true\n");

    discover = start("--adapter hci1 discover");
    EXPECT_NE(discover->readLine(), "");
    simulation.control("RemoveAdapter", with("hci1"));
    EXPECT_EQ(errorsOf(*discover), "hci1 was removed; plug it in and repeat the command\n");

    run("adapter set Powered on");
    discover = start("discover");
    EXPECT_NE(discover->readLine(), "");
    simulation.process().kill();
    EXPECT_EQ(errorsOf(*discover),
              "bluetoothd has left the system bus; start it again and repeat the command\n");
}

TEST_F(Streams, MonitorShowsEverySignalAlsoOfWhatComesLater) {
    const auto monitor = start("monitor --json");
    awaitEvent(*monitor, "event", "daemon-came"); // from now on nothing is missed

    run("adapter set Discoverable on");
    const Json changed = awaitEvent(*monitor, "arguments", {"Discoverable", true});
    EXPECT_EQ(changed["interface"], "org.bluez.Adapter");
    EXPECT_EQ(changed["member"], "PropertyChanged");

    simulation.control("AddAdapter", with(Settings{{"Address", "00:1A:7D:DA:71:12"}}));
    const Json added = awaitEvent(*monitor, "member", "AdapterAdded");
    run("--adapter hci2 adapter set Name new");
    EXPECT_EQ(awaitEvent(*monitor, "arguments", {"Name", "new"})["path"], added["arguments"][0]);

    simulation.control("Restart");
    awaitEvent(*monitor, "event", "daemon-gone");
    awaitEvent(*monitor, "event", "daemon-came");
    run("create "s + pinReceiver);
    const Json created = awaitEvent(*monitor, "member", "DeviceCreated");
    EXPECT_NE(created["path"], changed["path"]);
    awaitEvent(*monitor, "path", created["arguments"][0]); // a device's own signal

    monitor->signal(SIGTERM);
    EXPECT_EQ(errorsOf(*monitor, 0), "");
}

TEST_F(Streams, SignalsOfStrangersAreNotBelieved) {
    const auto monitor = start("monitor --json");
    awaitEvent(*monitor, "event", "daemon-came");
    const auto discover = start("discover --json");
    awaitEvent(*discover, "event", "found");
    const auto waiting = start("wait found "s + newDevice);
    awaitCall("StartDiscovery", 2);

    const std::string path = json("adapter")["path"];
    RawPeer& stranger = simulation.peer();
    stranger.emitToEach(path, "org.bluez.Adapter", "DeviceFound",
                        with(newDevice, Settings{{"Name", "Forged"}}));
    stranger.emitToEach(path, "org.bluez.Adapter", "PropertyChanged", with("Powered", Var{false}));
    stranger.emitToEach("/", "org.bluez.Manager", "AdapterRemoved", with(Path{path}));
    stranger.emitToEach(DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, "NameOwnerChanged",
                        with("org.bluez", "org.bluez", ""));
    run("adapter set Powered off");
    for (ChildProcess* program : {waiting.get(), discover.get()}) {
        const std::string printed = program->readAll();
        EXPECT_EQ(printed.find(newDevice), std::string::npos) << printed;
        EXPECT_EQ(errorsOf(*program),
                  "hci0 is off; switch it on: kesbt --adapter hci0 adapter set Powered true\n");
    }
    while (!HasFailure()) {
        const Json event = Json::parse(monitor->readLine());
        EXPECT_EQ(event["event"], "signal");
        EXPECT_EQ(event.dump().find(newDevice), std::string::npos) << event;
        if (event["arguments"] == Json{"Powered", false})
            break;
    }
    EXPECT_EQ(json("adapter")["properties"]["Powered"], false);
}

TEST_F(Streams, ForPeopleTheyAreReadable) {
    const auto monitor = start("monitor");
    EXPECT_EQ(monitor->readLine().substr(12), "  bluetoothd              is on the bus");
    run("adapter set Discoverable on");
    EXPECT_EQ(monitor->readLine().substr(12),
              "  hci0                    Adapter.PropertyChanged    Discoverable = yes");
    const Result result = run("--adapter hci1 discover --seconds 1");
    EXPECT_EQ(result.status, 0);
    EXPECT_NE(
        result.out.find("found     00:11:22:33:44:04  -70 dBm   0x001f00                  GPS "
                        "Receiver\n"),
        std::string::npos)
        << result;
    EXPECT_EQ(calls("StopDiscovery"), 1U); // after its time
}

TEST_F(Streams, WaitEndsWhenItIsSoAndFailsWhenTimeIsOver) {
    EXPECT_EQ(run("wait found "s + pinReceiver), (Result{0, "00:11:22:33:44:04 is found\n", ""}));
    EXPECT_EQ(failure("--timeout 0.2 wait connected "s + knownMouse),
              "00:11:22:33:44:06 was not connected within the time-out; try again or give a longer "
              "--timeout\n");

    const auto waiting = start("wait paired "s + pinReceiver); // not even known yet
    awaitCall("FindDevice");
    EXPECT_EQ(run("pair "s + pinReceiver + " --pin 1234").status, 0);
    EXPECT_EQ(errorsOf(*waiting, 0), "");
    EXPECT_LE(calls("FindDevice"), 4U) << "with that for the mouse, only when it may be so";

    const std::size_t asked = calls("FindDevice");
    const auto interrupted = start("wait paired "s + unreachableLaptop);
    awaitCall("FindDevice", asked + 1);
    interrupted->signal(SIGINT);
    EXPECT_EQ(errorsOf(*interrupted),
              "interrupted before 00:11:22:33:44:07 was paired; repeat the command to go on "
              "waiting\n");

    // What cannot come true any more is not waited for.
    const auto searching = start("wait found 00:11:22:33:44:99");
    awaitCall("StartDiscovery", 2);
    run("adapter set Powered off");
    EXPECT_EQ(errorsOf(*searching),
              "hci0 is off; switch it on: kesbt --adapter hci0 adapter set Powered true\n");
    const std::size_t read = calls("GetProperties");
    const auto pulledOut = start("wait powered");
    awaitCall("GetProperties", read + 1);
    simulation.control("RemoveAdapter", with("hci0"));
    EXPECT_EQ(errorsOf(*pulledOut), "hci0 was removed; plug it in and repeat the command\n");
}

} // namespace Bluetooth::Test
