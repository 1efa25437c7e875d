#include "sim/sim_fixture.h"

namespace Bluetooth::Test {

namespace {

constexpr const char* headset =
    "'Name': <'Headset'>, 'Class': <uint32 0x240404>, 'UUIDs': <['110b', '110e']>";

class DeviceTest : public SimTest {
protected:
    std::string device = "dev_00_11_22_33_44_55 ";
    std::string path = "'hci0/dev_00_11_22_33_44_55'";

    void startCreating() {
        client->taken();
        client->start("create", adapter, "Adapter.CreateDevice", "('00:11:22:33:44:55',)");
    }
};

TEST_F(DeviceTest, CreatingADeviceAnnouncesItAndAnswersAfterTheSearch) {
    addDevice(phone, "'Name': <'Phone'>, 'UUIDs': <['1101']>, 'Vendor': <uint16 15>");
    startCreating();
    EXPECT_EQ(
        client->until("reply create"),
        (Lines{"hci0 DeviceCreated " + path, "hci0 Devices=[" + path + "]",
               device + "Connected=true", device + "Name='Phone'", device + "Alias='Phone'",
               device + "Vendor=15", device + "Product=0", device + "Version=0",
               device + "UUIDs=['00001101-0000-1000-8000-00805f9b34fb']", "reply create " + path}));
    EXPECT_EQ(client->call(devicePath(), "Device.GetProperties"),
              "reply {'Address': <'00:11:22:33:44:55'>, 'Name': <'Phone'>, 'Alias': <'Phone'>, "
              "'Vendor': <15>, 'Product': <0>, 'Version': <0>, 'Paired': <false>, 'Trusted': "
              "<false>, 'Blocked': <false>, 'Connected': <true>, 'UUIDs': "
              "<['00001101-0000-1000-8000-00805f9b34fb']>, 'Services': <[]>, 'Adapter': <'hci0'>}");
    EXPECT_EQ(client->call(adapter, "Adapter.FindDevice", "('00:11:22:33:44:55',)"),
              "reply " + path);
    EXPECT_EQ(createDevice(phone), "error org.bluez.Error.AlreadyExists: Already Exists");
}

TEST_F(DeviceTest, ADeviceThatDoesNotAnswerIsTakenBack) {
    addDevice(phone, "'Behaviour': <'Unconnectable'>");
    startCreating();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{"hci0 DeviceCreated " + path, "hci0 Devices=[" + path + "]",
                     "error create org.bluez.Error.Failed: Host is down", "hci0 Devices=[]",
                     "hci0 DeviceRemoved " + path}));
    EXPECT_EQ(createDevice("00:11:22:33:44"),
              "error org.bluez.Error.InvalidArguments: Invalid arguments in method call");
    EXPECT_EQ(client->call(adapter, "Adapter.FindDevice", "('junk',)"),
              "error org.bluez.Error.DoesNotExist: Does Not Exist");
}

TEST_F(DeviceTest, LowerCaseAddressesGiveUpperCasePaths) {
    addDevice("00:aa:bb:cc:dd:ee");
    EXPECT_EQ(createDevice("00:aa:bb:cc:dd:ee"), "reply 'hci0/dev_00_AA_BB_CC_DD_EE'");
}

TEST_F(DeviceTest, OnlyItsCallerCancelsACreation) {
    const std::string cancel = "Adapter.CancelDeviceCreation";
    const std::string address = "('00:11:22:33:44:55',)";
    EXPECT_EQ(client->call(adapter, cancel, address),
              "error org.bluez.Error.DoesNotExist: Does Not Exist");
    EXPECT_EQ(client->call(adapter, cancel, "('x',)"),
              "error org.bluez.Error.InvalidArguments: Invalid arguments in method call");
    client->control("SetTimes", "({'PageTimeout': <60000000>},)");
    startCreating();
    client->until("hci0 Devices");
    SimClient other;
    EXPECT_EQ(other.call(adapter, cancel, address),
              "error org.bluez.Error.NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(other.call(adapter, "Adapter.RemoveDevice", "(objectpath '" + devicePath() + "',)"),
              "error org.bluez.Error.DoesNotExist: Device creation in progress");
    client->start("cancel", adapter, cancel, address);
    EXPECT_EQ(client->until("reply cancel"),
              (Lines{"hci0 Devices=[]", "hci0 DeviceRemoved " + path,
                     "error create org.bluez.Error.Failed: Operation canceled", "reply cancel"}));
}

TEST_F(DeviceTest, ACreationEndsWithItsCaller) {
    client->control("SetTimes", "({'PageTimeout': <60000000>},)");
    auto other = std::make_unique<SimClient>();
    other->start("create", adapter, "Adapter.CreateDevice", "('00:11:22:33:44:55',)");
    client->until("hci0 Devices=[" + path + "]");
    other.reset();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{"hci0 Devices=[]", "hci0 DeviceRemoved " + path}));
}

TEST_F(DeviceTest, AnUnusedLinkDropsByItself) {
    client->control("SetTimes", "({'IdleDisconnect': <4000>},)");
    addDevice(phone);
    createDevice(phone);
    client->until(device + "Connected=false");
    EXPECT_EQ(client->call(adapter, "Adapter.ListDevices"), "reply [" + path + "]");
}

TEST_F(DeviceTest, ARemovedDeviceIsGone) {
    addDevice(phone);
    createDevice(phone);
    client->taken();
    const std::string argument = "(objectpath '" + devicePath() + "',)";
    client->start("remove", adapter, "Adapter.RemoveDevice", argument);
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{device + "DisconnectRequested", "reply remove", device + "Connected=false",
                     "hci0 Devices=[]", "hci0 DeviceRemoved " + path}));
    EXPECT_EQ(client->call(adapter, "Adapter.RemoveDevice", argument),
              "error org.bluez.Error.DoesNotExist: Does Not Exist");
    EXPECT_EQ(client->call(devicePath(), "Device.Disconnect").substr(0, 47),
              "error org.freedesktop.DBus.Error.UnknownObject:");

    createDevice(phone);
    client->control("DropLink", "('hci0', '00:11:22:33:44:55')");
    client->taken();
    client->start("remove", adapter, "Adapter.RemoveDevice", argument);
    EXPECT_EQ(client->until("reply remove"),
              (Lines{"hci0 Devices=[]", "hci0 DeviceRemoved " + path, "reply remove"}));
}

TEST_F(DeviceTest, DisconnectIsAnnouncedFirst) {
    addDevice(phone);
    createDevice(phone);
    client->taken();
    client->start("bye", devicePath(), "Device.Disconnect");
    EXPECT_EQ(client->until(device + "Connected"),
              (Lines{device + "DisconnectRequested", "reply bye", device + "Connected=false"}));
    EXPECT_EQ(client->call(devicePath(), "Device.Disconnect"),
              "error org.bluez.Error.NotConnected: Not Connected");
}

TEST_F(DeviceTest, PropertiesAreSaidBeforeTheReply) {
    addDevice(phone, "'Name': <'Phone'>");
    createDevice(phone);
    client->taken();
    const auto set = [&](const char* name, const char* value) {
        client->start("set", devicePath(), "Device.SetProperty",
                      std::string("('") + name + "', <" + value + ">)");
        client->control("ClearFaults");
        return client->taken();
    };
    EXPECT_EQ(set("Alias", "'Mine'"), (Lines{device + "Alias='Mine'", "reply set"}));
    EXPECT_EQ(set("Alias", "'Mine'"), (Lines{"reply set"}));
    EXPECT_EQ(set("Alias", "''"), (Lines{device + "Alias=''", "reply set"}));
    EXPECT_NE(client->call(devicePath(), "Device.GetProperties").find("'Alias': <'Phone'>"),
              std::string::npos);
    EXPECT_EQ(set("Trusted", "true"), (Lines{device + "Trusted=true", "reply set"}));
    EXPECT_EQ(set("Blocked", "true"),
              (Lines{device + "Connected=false", device + "Blocked=true", "reply set"}));
    const Lines refused = {
        "error set org.bluez.Error.InvalidArguments: Invalid arguments in method call"};
    EXPECT_EQ(set("Paired", "true"), refused);
    EXPECT_EQ(set("Trusted", "'true'"), refused);
}

TEST_F(DeviceTest, ServicesAreFoundByAnyFormOfTheirClass) {
    addDevice(phone, "'UUIDs': <['1101', '110b']>");
    createDevice(phone);
    const auto discover = [&](const std::string& pattern) {
        return client->call(devicePath(), "Device.DiscoverServices", "('" + pattern + "',)");
    };
    const std::string serial = discover("0x1101");
    EXPECT_EQ(
        serial.substr(0, 93),
        "reply {65536: '<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\\n\\n<record>\\n\\t<attribute "
        "id=\"0x0000\">");
    for (const char* form : {"1101", "spp", "00001101-0000-1000-8000-00805F9B34FB"})
        EXPECT_EQ(discover(form), serial) << form;
    EXPECT_NE(discover("").find("65537: "), std::string::npos);
    EXPECT_EQ(discover("1200"), "reply {}");
    EXPECT_EQ(discover("nonsense"),
              "error org.bluez.Error.InvalidArguments: Invalid arguments in method call");
}

TEST_F(DeviceTest, ASearchCanBeCancelledByItsCaller) {
    addDevice(phone);
    createDevice(phone);
    EXPECT_EQ(client->call(devicePath(), "Device.CancelDiscovery"),
              "error org.bluez.Error.DoesNotExist: Does Not Exist");
    client->control("SetTimes", "({'ServiceSearch': <60000000>},)");
    client->taken();
    client->start("search", devicePath(), "Device.DiscoverServices", "('',)");
    EXPECT_EQ(client->call(devicePath(), "Device.DiscoverServices", "('',)"),
              "error org.bluez.Error.InProgress: In Progress");
    client->start("cancel", devicePath(), "Device.CancelDiscovery");
    EXPECT_EQ(client->until("reply cancel"),
              (Lines{"error search org.bluez.Error.Failed: Operation canceled", "reply cancel"}));
    setProperty(adapter, "Adapter", "Powered", "false");
    EXPECT_EQ(client->call(devicePath(), "Device.DiscoverServices", "('',)"),
              "error org.bluez.Error.Failed: No route to host");
}

TEST_F(DeviceTest, AudioConnectsWithAllItsInterfacesAndDisconnects) {
    addDevice(phone, headset);
    createDevice(phone);
    client->taken();
    EXPECT_EQ(client->call(devicePath(), "Control.VolumeUp"),
              "error org.bluez.Error.NotConnected: Not Connected");
    client->start("sink", devicePath(), "AudioSink.Connect");
    EXPECT_EQ(client->until("reply sink"),
              (Lines{device + "State='connecting'", device + "State='connecting'",
                     device + "Connected", device + "Connected=true", device + "State='connected'",
                     device + "State='connected'", "reply sink"}));
    EXPECT_EQ(client->until(device + "Connected=true"),
              (Lines{device + "Connected", device + "Connected=true"}));
    EXPECT_EQ(client->call(devicePath(), "Control.VolumeUp"), "reply");
    EXPECT_EQ(client->call(devicePath(), "AudioSink.Connect"),
              "error org.bluez.Error.AlreadyConnected: Already Connected");
    client->control("SetPlaying", "('hci0', '00:11:22:33:44:55', true)");
    EXPECT_EQ(client->taken(),
              (Lines{device + "Playing", device + "Playing=true", device + "State='playing'"}));
    EXPECT_EQ(client->call(devicePath(), "AudioSink.GetProperties"),
              "reply {'State': <'playing'>, 'Connected': <true>, 'Playing': <true>}");
    client->start("off", devicePath(), "Audio.Disconnect");
    const Lines lines = client->until("reply off");
    EXPECT_EQ(lines.front(), device + "Stopped");
    EXPECT_EQ(client->call(devicePath(), "Audio.GetProperties"),
              "reply {'State': <'disconnected'>}");
    EXPECT_EQ(client->call(devicePath(), "Audio.Disconnect"),
              "error org.bluez.Error.NotConnected: Not Connected");
}

TEST_F(DeviceTest, AudioOfADeviceThatIsAwayFails) {
    addDevice(phone, headset);
    createDevice(phone);
    setDevice(phone, "'Connectable': <false>");
    client->taken();
    client->start("audio", devicePath(), "Audio.Connect");
    EXPECT_EQ(client->until("error audio").back(),
              "error audio org.bluez.Error.Failed: Connect Failed");
}

TEST_F(DeviceTest, AServiceOfAnUntrustedDeviceNeedsTheAgentsConsent) {
    addDevice(phone, std::string(headset) + ", 'ConnectsBack': <true>");
    createDevice(phone);
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    const std::string asked = "agent Authorize " + path + " '0000110d-0000-1000-8000-00805f9b34fb'";
    client->agentAnswers("Authorize", "!org.bluez.Error.Rejected");
    EXPECT_EQ(client->call(devicePath(), "AudioSink.Connect"),
              "error org.bluez.Error.Failed: Stream setup failed");
    client->until(asked);
    client->agentAnswers("Authorize", "");
    client->control("ConnectService", "('hci0', '00:11:22:33:44:55', '110d')");
    client->until(asked);
    client->until(device + "State='connected'");
    client->call(devicePath(), "Audio.Disconnect");
    setProperty(devicePath(), "Device", "Trusted", "true");
    client->taken();
    EXPECT_EQ(client->call(devicePath(), "Audio.Connect"), "reply");
    for (const std::string& line : client->taken())
        EXPECT_EQ(line.find("agent"), std::string::npos) << line;
}

TEST_F(DeviceTest, ADeviceThatConnectsByItselfStaysOnlyAsLongAsItsLink) {
    addDevice(phone, "'UUIDs': <['1101']>");
    client->control("ConnectDevice", "('hci0', '00:11:22:33:44:55')");
    EXPECT_EQ(client->until(device + "UUIDs"),
              (Lines{"hci0 DeviceCreated " + path, "hci0 Devices=[" + path + "]",
                     device + "Connected=true",
                     device + "UUIDs=['00001101-0000-1000-8000-00805f9b34fb']"}));
    client->control("DropLink", "('hci0', '00:11:22:33:44:55')");
    EXPECT_EQ(client->taken(),
              (Lines{device + "Connected=false", "hci0 Devices=[]", "hci0 DeviceRemoved " + path}));
}

} // namespace

} // namespace Bluetooth::Test
