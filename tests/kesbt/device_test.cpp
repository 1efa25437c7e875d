#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

namespace {

class DeviceVerbs : public KesbtTest {};

TEST_F(DeviceVerbs, AKnownDeviceIsListedAndShown) {
    EXPECT_EQ(run({"devices"}),
              (Result{0,
                      "ADDRESS            PAIRED  TRUSTED  CONNECTED  KIND         NAME\n"
                      "00:11:22:33:44:06  yes     yes      no         input-mouse  Desk Mouse\n",
                      ""}));
    const Json device = run({"device", mouse, "--json"}).json();
    EXPECT_EQ(device["properties"]["Paired"], true);
    EXPECT_EQ(run({"devices", "--json"}).json(), Json::array({device}));
    EXPECT_EQ(run({"--adapter", "hci1", "devices", "--json"}).json(), Json::array());
}

TEST_F(DeviceVerbs, CreateServicesAndRemove) {
    EXPECT_EQ(failure({"device", headset}),
              "hci0 does not know 00:11:22:33:44:01; see what it knows: kesbt devices, or make it "
              "known: kesbt create 00:11:22:33:44:01\n");
    const Json created = run({"create", "00:11:22:33:44:01", "--json"}).json();
    EXPECT_EQ(created["properties"]["Name"], "Kestrine Headset");
    EXPECT_NE(failure({"create", headset}).find("Already Exists"), std::string::npos);

    const Json sink = run({"services", headset, "0x110b", "--json"}).json();
    ASSERT_EQ(sink.size(), 1U);
    EXPECT_EQ(sink[0]["uuids"][0], "0x110b");
    EXPECT_NE(run({"services", headset}).out.find("0x110b  Audio Sink"), std::string::npos);
    EXPECT_NE(failure({"services", headset, "junk"}).find("Invalid arguments"), std::string::npos);

    EXPECT_EQ(run({"remove", headset}).out, "Removed 00:11:22:33:44:01 from hci0\n");
    failure({"remove", headset});
    failure({"device", headset});
}

TEST_F(DeviceVerbs, AnUnreachableDeviceIsNotCreated) {
    EXPECT_EQ(failure({"create", laptop}),
              "cannot create 00:11:22:33:44:07 on hci0: Host is down; make sure that the device is "
              "on and within reach\n");
    run({"adapter", "set", "Powered", "off"});
    EXPECT_EQ(failure({"create", laptop}),
              "cannot create 00:11:22:33:44:07 on hci0: Resource Not Ready; the adapter is off, "
              "switch it on: kesbt adapter set Powered true\n");
}

TEST_F(DeviceVerbs, ACreationThatIsInterruptedOrTakesTooLongIsCancelled) {
    setTimeScale(1);
    EXPECT_EQ(failure({"--timeout", "0.2", "create", laptop}).substr(0, 48),
              "time is over while creating 00:11:22:33:44:07; m");
    awaitCall("CancelDeviceCreation");
    const auto creating = start({"create", laptop});
    awaitCall("CreateDevice", 2);
    creating->signal(SIGINT);
    const Result result = finish(*creating);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "interrupted while creating 00:11:22:33:44:07; repeat the command to try again\n");
    awaitCall("CancelDeviceCreation", 2);
    failure({"device", laptop});
}

TEST_F(DeviceVerbs, AServiceSearchThatTakesTooLongIsCancelled) {
    setTimeScale(20);
    EXPECT_EQ(failure({"--timeout", "0.2", "services", mouse}).substr(0, 37),
              "time is over while reading the servic");
    awaitCall("CancelDiscovery");
}

TEST_F(DeviceVerbs, AudioIsConnectedShownAndDisconnected) {
    run({"create", headset});
    EXPECT_EQ(failure({"audio", "status", mouse}),
              "00:11:22:33:44:06 has no audio; see what it has: kesbt services "
              "00:11:22:33:44:06\n");
    EXPECT_EQ(failure({"volume", "up", headset}),
              "the remote control of 00:11:22:33:44:01 is not connected; connect it first: kesbt "
              "audio connect 00:11:22:33:44:01\n");
    EXPECT_EQ(failure({"volume", "up", mouse}),
              "00:11:22:33:44:06 has no remote control; see what it has: kesbt services "
              "00:11:22:33:44:06\n");

    const Json connected = run({"audio", "connect", headset, "--json"}).json();
    EXPECT_EQ(connected["audio"]["State"], "connected");
    EXPECT_EQ(run({"audio", "connect", headset}).status, 0); // it is so already
    EXPECT_EQ(run({"volume", "down", headset}).out, "Volume down sent to 00:11:22:33:44:01\n");
    awaitCall("VolumeDown");
    EXPECT_EQ(run({"audio", "disconnect", headset, "--json"}).json()["audio"]["State"],
              "disconnected");
    run({"remove", headset});
    run({"create", headset});
    control("SetDevice", [](Writer& w) {
        w(headset).dict("sv", [](Writer& d) { d.entry("Connectable", Var{false}); });
    });
    control("DropLink", [](Writer& w) { w("hci0")(headset); });
    EXPECT_NE(failure({"audio", "connect", headset}).find("Connect Failed"), std::string::npos);
}

} // namespace

} // namespace Bluetooth::Test
