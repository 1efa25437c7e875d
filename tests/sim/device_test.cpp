#include "sim/sim_test.h"

namespace Bluetooth::Test {

namespace {

using DeviceTest = SimTest;

constexpr const char* serialPort = "'00001101-0000-1000-8000-00805f9b34fb'";
const std::string headset =
    "'Name': <'Headset'>, 'Class': <uint32 0x240404>, 'UUIDs': <['110b', '110e']>";
const std::string unknownDevice = "error DoesNotExist: Does Not Exist";

TEST_F(DeviceTest, CreatingADeviceAnnouncesItAndAnswersAfterTheSearch) {
    add("'Name': <'Phone'>, 'UUIDs': <['1101']>, 'Vendor': <uint16 15>");
    const std::string uuids = std::string("[") + serialPort + "]";
    EXPECT_EQ(client->trace("Adapter.CreateDevice", byAddress),
              created + lines("phone Connected=true", "phone Name='Phone'", "phone Alias='Phone'",
                              "phone Vendor=15", "phone Product=0", "phone Version=0",
                              "phone UUIDs=" + uuids, "reply call phone"));
    EXPECT_EQ(client->call("Device.GetProperties"),
              "reply {'Address': <'00:11:22:33:44:55'>, 'Name': <'Phone'>, 'Alias': <'Phone'>, "
              "'Vendor': <15>, 'Product': <0>, 'Version': <0>, 'Paired': <false>, 'Trusted': "
              "<false>, 'Blocked': <false>, 'Connected': <true>, 'UUIDs': <" +
                  uuids + ">, 'Services': <[]>, 'Adapter': <'hci0'>}");
    EXPECT_EQ(client->call("Adapter.FindDevice", byAddress), "reply phone");
    EXPECT_EQ(client->call("Adapter.CreateDevice", byAddress),
              "error AlreadyExists: Already Exists");
    add("", "00:aa:bb:cc:dd:ee");
    EXPECT_EQ(client->call("Adapter.CreateDevice", "('00:aa:bb:cc:dd:ee',)"),
              "reply 'hci0/dev_00_AA_BB_CC_DD_EE'");
}

TEST_F(DeviceTest, ADeviceThatDoesNotAnswerIsTakenBack) {
    add("'Behaviour': <'Unconnectable'>");
    EXPECT_EQ(client->trace("Adapter.CreateDevice", byAddress, "hci0 DeviceRemoved"),
              created + lines("error call Failed: Host is down") + removed);
    EXPECT_EQ(client->call("Adapter.CreateDevice", "('00:11:22:33:44',)"), "error " + badArguments);
    EXPECT_EQ(client->call("Adapter.FindDevice", "('junk',)"), unknownDevice);
}

TEST_F(DeviceTest, ACreationEndsWithItsCallerWhoAloneCancelsIt) {
    const std::string cancel = "Adapter.CancelDeviceCreation";
    EXPECT_EQ(client->call(cancel, byAddress), unknownDevice);
    EXPECT_EQ(client->call(cancel, "('x',)"), "error " + badArguments);
    setTimes("'PageTimeout': <60000000>");
    client->start("create", "Adapter.CreateDevice", byAddress);
    client->until(created[1]);
    auto other = std::make_unique<SimClient>();
    other->base();
    EXPECT_EQ(other->call(cancel, byAddress), "error NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(other->call("Adapter.RemoveDevice", byPath),
              "error DoesNotExist: Device creation in progress");
    EXPECT_EQ(client->trace(cancel, byAddress),
              removed + lines("error create Failed: Operation canceled", "reply call"));

    other->start("create", "Adapter.CreateDevice", byAddress);
    client->until(created[1]);
    other.reset();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"), removed);
}

TEST_F(DeviceTest, ARemovedDeviceIsGone) {
    create();
    EXPECT_EQ(client->trace("Adapter.RemoveDevice", byPath, "hci0 DeviceRemoved"),
              lines("phone DisconnectRequested", "reply call", "phone Connected=false") + removed);
    EXPECT_EQ(client->call("Adapter.RemoveDevice", byPath), unknownDevice);
    EXPECT_EQ(
        client->call("Device.Disconnect").find("error org.freedesktop.DBus.Error.UnknownObject:"),
        0U);
    client->call("Adapter.CreateDevice", byAddress);
    client->control("DropLink", onAdapter);
    EXPECT_EQ(client->trace("Adapter.RemoveDevice", byPath), removed + lines("reply call"));
}

TEST_F(DeviceTest, LinksEndByThemselvesOrAfterAnAnnouncement) {
    create();
    EXPECT_EQ(client->trace("Device.Disconnect", "()", "phone Connected"),
              lines("phone DisconnectRequested", "reply call", "phone Connected=false"));
    EXPECT_EQ(client->call("Device.Disconnect"), "error NotConnected: Not Connected");
    EXPECT_EQ(client->call("Adapter.RemoveDevice", byPath), "reply");
    setTimes("'IdleDisconnect': <4000>");
    client->call("Adapter.CreateDevice", byAddress);
    client->until("phone Connected=false");
    EXPECT_EQ(client->call("Adapter.ListDevices"), "reply [phone]");
}

TEST_F(DeviceTest, PropertiesAreSaidBeforeTheReply) {
    create("'Name': <'Phone'>");
    EXPECT_EQ(set("Alias", "'Mine'", "Device"), lines("phone Alias='Mine'", "reply set"));
    EXPECT_EQ(set("Alias", "'Mine'", "Device"), lines("reply set"));
    EXPECT_EQ(set("Alias", "''", "Device"), lines("phone Alias=''", "reply set"));
    EXPECT_NE(client->call("Device.GetProperties").find("'Alias': <'Phone'>"), std::string::npos);
    EXPECT_EQ(set("Trusted", "true", "Device"), lines("phone Trusted=true", "reply set"));
    EXPECT_EQ(set("Blocked", "true", "Device"),
              lines("phone Connected=false", "phone Blocked=true", "reply set"));
    EXPECT_EQ(set("Paired", "true", "Device"), lines("error set " + badArguments));
    EXPECT_EQ(set("Trusted", "'true'", "Device"), lines("error set " + badArguments));
}

TEST_F(DeviceTest, ServicesAreFoundByAnyFormOfTheirClass) {
    create("'UUIDs': <['1101', '110b']>");
    const auto discover = [&](const std::string& pattern) {
        return client->call("Device.DiscoverServices", "('" + pattern + "',)");
    };
    const std::string serial = discover("0x1101");
    EXPECT_EQ(serial.find("reply {65536: '<?xml version=\"1.0\" encoding=\"UTF-8\" "
                          "?>\\n\\n<record>\\n\\t<attribute id=\"0x0000\">"),
              0U);
    for (const char* form : {"1101", "spp", "00001101-0000-1000-8000-00805F9B34FB"})
        EXPECT_EQ(discover(form), serial) << form;
    EXPECT_NE(discover("").find("65537: "), std::string::npos);
    EXPECT_EQ(discover("1200"), "reply {}");
    EXPECT_EQ(discover("nonsense"), "error " + badArguments);
}

TEST_F(DeviceTest, ASearchCanBeCancelledByItsCaller) {
    create();
    EXPECT_EQ(client->call("Device.CancelDiscovery"), unknownDevice);
    setTimes("'ServiceSearch': <60000000>");
    client->start("search", "Device.DiscoverServices", "('',)");
    EXPECT_EQ(client->call("Device.DiscoverServices", "('',)"), "error InProgress: In Progress");
    EXPECT_EQ(client->trace("Device.CancelDiscovery"),
              lines("error search Failed: Operation canceled", "reply call"));
    client->start("search", "Device.DiscoverServices", "('',)");
    client->control("DropLink", onAdapter);
    EXPECT_EQ(client->until("error search").back(),
              "error search ConnectionAttemptFailed: Host is down");
    set("Powered", "false");
    EXPECT_EQ(client->call("Device.DiscoverServices", "('',)"), "error Failed: No route to host");
}

TEST_F(DeviceTest, AudioConnectsWithAllItsInterfacesAndDisconnects) {
    create(headset);
    EXPECT_EQ(client->call("Control.VolumeUp"), "error NotConnected: Not Connected");
    const Texts connected{"phone Connected", "phone Connected=true"};
    EXPECT_EQ(client->trace("AudioSink.Connect"),
              lines("phone State='connecting'", "phone State='connecting'") + connected +
                  lines("phone State='connected'", "phone State='connected'", "reply call"));
    EXPECT_EQ(client->until("phone Connected=true"), connected);
    EXPECT_EQ(client->call("Control.VolumeUp"), "reply");
    EXPECT_EQ(client->call("AudioSink.Connect"), "error AlreadyConnected: Already Connected");
    client->control("SetPlaying", "('hci0', '00:11:22:33:44:55', true)");
    EXPECT_EQ(client->taken(),
              lines("phone Playing", "phone Playing=true", "phone State='playing'"));
    EXPECT_EQ(client->call("AudioSink.IsConnected"), "reply true");
    EXPECT_EQ(client->call("Control.IsConnected"), "reply true");
    EXPECT_EQ(client->call("Control.GetProperties"), "reply {'Connected': <true>}");
    EXPECT_EQ(client->call("AudioSink.GetProperties"),
              "reply {'State': <'playing'>, 'Connected': <true>, 'Playing': <true>}");
    EXPECT_EQ(client->trace("Audio.Disconnect").front(), "phone Stopped");
    EXPECT_EQ(client->call("Audio.GetProperties"), "reply {'State': <'disconnected'>}");
    EXPECT_EQ(client->call("Audio.Disconnect"), "error NotConnected: Not Connected");
    EXPECT_EQ(client->call("AudioSink.Disconnect"), "error NotConnected: Not Connected");
    EXPECT_EQ(client->call("AudioSink.Connect"), "reply");
    EXPECT_EQ(client->call("AudioSink.Disconnect"), "reply");
    client->control("SetDevice", "('00:11:22:33:44:55', {'Connectable': <false>})");
    EXPECT_EQ(client->call("Audio.Connect"), "error Failed: Connect Failed");
}

TEST_F(DeviceTest, AServiceOfAnUntrustedDeviceNeedsTheAgentsConsent) {
    create(headset + ", 'ConnectsBack': <true>");
    registerAgent();
    const std::string asked = "agent Authorize phone '0000110d-0000-1000-8000-00805f9b34fb'";
    client->agentAnswers("Authorize", "!org.bluez.Error.Rejected");
    EXPECT_EQ(client->call("AudioSink.Connect"), "error Failed: Stream setup failed");
    client->until(asked);
    client->agentAnswers("Authorize", "");
    client->control("ConnectService", "('hci0', '00:11:22:33:44:55', '110d')");
    client->until(asked);
    client->until("phone State='connected'");
    client->call("Audio.Disconnect");
    set("Trusted", "true", "Device");
    for (const std::string& line : client->trace("Audio.Connect"))
        EXPECT_EQ(line.find("agent"), std::string::npos) << line;
}

TEST_F(DeviceTest, ADeviceThatConnectsByItselfStaysOnlyAsLongAsItsLink) {
    add("'UUIDs': <['1101']>");
    client->control("ConnectDevice", onAdapter);
    EXPECT_EQ(client->until("phone UUIDs"),
              created +
                  lines("phone Connected=true", std::string("phone UUIDs=[") + serialPort + "]"));
    client->control("DropLink", onAdapter);
    EXPECT_EQ(client->taken(), lines("phone Connected=false") + removed);
}

} // namespace

} // namespace Bluetooth::Test
