// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

namespace Bluetooth::Test {

using DeviceTest = SimTest;

const std::string serialPort = "a(s:00001101-0000-1000-8000-00805f9b34fb)";
const std::string withId =
    serialPort.substr(0, serialPort.size() - 1) + " s:00001200" + serialPort.substr(12);
const std::string unknownDevice = "error DoesNotExist: Does Not Exist";
const std::string notConnected = "error NotConnected: Not Connected";

TEST_F(DeviceTest, CreatingADeviceAnnouncesItAndAnswersAfterTheSearch) {
    add({{"Name", "Phone"}, {"UUIDs", "1101"}, {"Vendor", "15"}});
    EXPECT_EQ(trace({"Adapter.CreateDevice", newDevice}),
              created + lines("device Connected=b:1", "device Name=s:Phone", "device Alias=s:Phone",
                              "device Vendor=q:15", "device UUIDs=" + withId,
                              "answer CreateDevice o:device"));
    EXPECT_EQ(call("Device.GetProperties"),
              "a(e(s:Address v(s:00:11:22:33:44:55)) e(s:Name v(s:Phone)) e(s:Alias v(s:Phone)) "
              "e(s:Vendor v(q:15)) e(s:Paired v(b:0)) e(s:Trusted v(b:0)) e(s:Blocked v(b:0)) "
              "e(s:Connected v(b:1)) e(s:UUIDs v(" +
                  withId + ")) e(s:Services v(a())) e(s:Adapter v(o:hci0)))");
    EXPECT_EQ(call({"Adapter.FindDevice", newDevice}), "o:device");
    EXPECT_EQ(call({"Adapter.CreateDevice", newDevice}), "error AlreadyExists: Already Exists");
    // The id and the name are kept: the one is said before the object, the other no more.
    call({"Adapter.RemoveDevice", device});
    control({"SetDevice", newDevice, Settings{{"Version", "1"}, {"UUIDs", "1101;1200"}}});
    EXPECT_EQ(trace({"Adapter.CreateDevice", newDevice}),
              lines("device Vendor=q:15") + created +
                  lines("device Connected=b:1", "device Version=q:1", "device UUIDs=" + withId,
                        "answer CreateDevice o:device"));
    add({}, "00:aa:bb:cc:dd:ee");
    EXPECT_EQ(call({"Adapter.CreateDevice", "00:aa:bb:cc:dd:ee"}), "o:hci0/dev_00_AA_BB_CC_DD_EE");
}

TEST_F(DeviceTest, ADeviceThatDoesNotAnswerIsTakenBack) {
    add({{"Behaviour", "Unconnectable"}});
    EXPECT_EQ(trace({"Adapter.CreateDevice", newDevice}, removed[1]),
              created + lines("answer CreateDevice error Failed: Host is down") + removed);
    EXPECT_EQ(call({"Adapter.CreateDevice", "00:11:22:33:44"}), badArguments);
    EXPECT_EQ(call({"Adapter.FindDevice", "junk"}), unknownDevice);
}

TEST_F(DeviceTest, ACreationEndsWithItsCallerWhoAloneCancelsIt) {
    const Question cancel("Adapter.CancelDeviceCreation", newDevice);
    EXPECT_EQ(call(cancel), unknownDevice);
    EXPECT_EQ(call({"Adapter.CancelDeviceCreation", "x"}), badArguments);
    setTime("PageTimeout", "60000000");
    start({"Adapter.CreateDevice", newDevice});
    until(created[1]);
    auto other = std::make_unique<SimClient>();
    EXPECT_EQ(other->call(cancel), "error NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(other->call({"Adapter.RemoveDevice", device}),
              "error DoesNotExist: Device creation in progress");
    EXPECT_EQ(trace(cancel), removed + lines("answer CreateDevice error Failed: Operation canceled",
                                             "answer CancelDeviceCreation"));

    other->start({"Adapter.CreateDevice", newDevice});
    until(created[1]);
    other.reset();
    EXPECT_EQ(until(removed[1]), removed);

    add(); // and once it is connected:
    setTime("ServiceSearch", "60000000");
    start({"Adapter.CreateDevice", newDevice});
    until("device Connected=b:1");
    EXPECT_EQ(trace(cancel, removed[1]),
              lines("answer CreateDevice error Failed: Operation canceled",
                    "device DisconnectRequested", "answer CancelDeviceCreation",
                    "device Connected=b:0") +
                  removed);
    start({"Adapter.CreateDevice", newDevice});
    until("device Connected=b:1");
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(taken(), lines("device Connected=b:0") + removed +
                           lines("answer CreateDevice error Failed: Operation canceled"));
}

TEST_F(DeviceTest, ARemovedDeviceIsGone) {
    const Question remove("Adapter.RemoveDevice", device);
    create();
    EXPECT_EQ(trace(remove, removed[1]),
              lines("device DisconnectRequested", "answer RemoveDevice", "device Connected=b:0") +
                  removed);
    EXPECT_EQ(call(remove), unknownDevice);
    EXPECT_EQ(call("Device.Disconnect").rfind("error org.freedesktop.DBus.Error.UnknownObject:", 0),
              0U);
    call({"Adapter.CreateDevice", newDevice});
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(trace(remove), removed + lines("answer RemoveDevice"));
}

TEST_F(DeviceTest, LinksEndByThemselvesOrAfterAnAnnouncement) {
    create();
    EXPECT_EQ(trace("Device.Disconnect", "device Connected"),
              lines("device DisconnectRequested", "answer Disconnect", "device Connected=b:0"));
    EXPECT_EQ(call("Device.Disconnect"), notConnected);
    EXPECT_EQ(call({"Adapter.RemoveDevice", device}), "");
    setTime("IdleDisconnect", "4000");
    call({"Adapter.CreateDevice", newDevice});
    until("device Connected=b:0");
    EXPECT_EQ(call("Adapter.ListDevices"), "a(o:device)");
}

TEST_F(DeviceTest, PropertiesAreSaidBeforeTheReply) {
    const std::string answer = "answer SetProperty";
    create({{"Name", "Phone"}});
    EXPECT_EQ(setOfDevice("Alias", "Mine"), lines("device Alias=s:Mine", answer));
    EXPECT_EQ(setOfDevice("Alias", "Mine"), lines(answer));
    EXPECT_EQ(setOfDevice("Alias", ""), lines("device Alias=s:", answer));
    EXPECT_NE(call("Device.GetProperties").find("(s:Alias v(s:Phone))"), std::string::npos);
    EXPECT_EQ(setOfDevice("Trusted", true), lines("device Trusted=b:1", answer));
    EXPECT_EQ(setOfDevice("Blocked", true),
              lines("device Blocked=b:1", answer, "device Connected=b:0"));
    EXPECT_EQ(setOfDevice("Paired", true), lines(answer + " " + badArguments));
    EXPECT_EQ(setOfDevice("Trusted", "true"), lines(answer + " " + badArguments));
}

TEST_F(DeviceTest, ServicesAreFoundByAnyFormOfTheirClass) {
    create({{"UUIDs", "1101;1112"}});
    const auto discover = [&](const char* pattern) {
        return call({"Device.DiscoverServices", pattern});
    };
    const std::string serial = discover("0x1101");
    EXPECT_EQ(serial.rfind("a(e(u:65536 s:<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n\n<record>"
                           "\n\t<attribute id=\"0x0000\">",
                           0),
              0U);
    for (const char* form : {"1101", "SPP", "00001101-0000-1000-8000-00805F9B34FB"})
        EXPECT_EQ(discover(form), serial) << form;
    EXPECT_NE(discover("").find("e(u:65537 "), std::string::npos);
    EXPECT_EQ(discover("hsp").rfind("a(e(u:65537 ", 0), 0U); // in the list of its profiles
    EXPECT_EQ(discover("1200"), "a()");
    EXPECT_EQ(discover("nonsense"), badArguments);
}

TEST_F(DeviceTest, ASearchCanBeCancelledByItsCaller) {
    create();
    const Question search("Device.DiscoverServices", "");
    const std::string canceled = "answer DiscoverServices error Failed: Operation canceled";
    EXPECT_EQ(call("Device.CancelDiscovery"), unknownDevice);
    setTime("ServiceSearch", "60000000");
    start(search);
    EXPECT_EQ(call(search), "error InProgress: In Progress");
    EXPECT_EQ(trace("Device.CancelDiscovery"), lines(canceled, "answer CancelDiscovery"));
    control({"DropLink", "hci0", newDevice}); // and before the link is up, which then stays down
    taken();
    setTime("Connect", "60000000");
    start(search);
    EXPECT_EQ(trace("Device.CancelDiscovery").front(), canceled);
    setTime("Connect", "600");
    start(search);
    until("device Connected=b:1");
    EXPECT_EQ(call({"Adapter.RemoveDevice", device}),
              "error DoesNotExist: Device creation in progress");
    EXPECT_EQ(
        trace("Device.Disconnect", "device Connected"),
        lines(canceled, "device DisconnectRequested", "answer Disconnect", "device Connected=b:0"));
    start(search);
    until("device Connected=b:1");
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(until("answer").back(),
              "answer DiscoverServices error ConnectionAttemptFailed: Host is down");
    set("Powered", false);
    EXPECT_EQ(call(search), "error Failed: No route to host");
}

TEST_F(DeviceTest, ADeviceThatConnectsByItselfStaysOnlyAsLongAsItsLink) {
    add({{"UUIDs", "1101"}, {"Class", "0x2540"}});
    control({"ConnectDevice", "hci0", newDevice});
    EXPECT_EQ(until("device UUIDs"),
              created + lines("device Connected=b:1", "device UUIDs=" + serialPort));
    EXPECT_NE(call("Device.GetProperties").find("(s:Icon v(s:input-keyboard))"), std::string::npos);
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(taken(), lines("device Connected=b:0") + removed);
}

} // namespace Bluetooth::Test
