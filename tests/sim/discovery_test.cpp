#include "sim/sim_fixture.h"

namespace Bluetooth::Test {

namespace {

class DiscoveryTest : public SimTest {
protected:
    void setTimes(const std::string& times) { client->control("SetTimes", "({" + times + "},)"); }
};

const std::string found = "hci0 DeviceFound '00:11:22:33:44:55' ";

TEST_F(DiscoveryTest, ADeviceIsFoundOnceWithItsValuesInOrder) {
    addDevice(phone, "'Name': <'Phone'>, 'Class': <uint32 0x5a020c>, 'UUIDs': <['110a', '1112']>, "
                     "'RSSI': <int16 -48>, 'LegacyPairing': <true>");
    client->start("start", adapter, "Adapter.StartDiscovery");
    const Lines lines = client->until("hci0 Discovering=false");
    EXPECT_EQ(lines,
              (Lines{"reply start", "hci0 Discovering=true",
                     found + "{'Address': <'00:11:22:33:44:55'>, 'Class': <5898764>, "
                             "'Icon': <'phone'>, 'RSSI': <-48>, 'Name': <'Phone'>, "
                             "'Alias': <'Phone'>, 'LegacyPairing': <true>, 'Paired': <false>, "
                             "'Trusted': <false>, 'UUIDs': "
                             "<['0000110a-0000-1000-8000-00805f9b34fb', "
                             "'00001112-0000-1000-8000-00805f9b34fb']>}",
                     "hci0 Discovering=false"}));
    EXPECT_EQ(client->until("hci0 Discovering=false"),
              (Lines{"hci0 Discovering=true", "hci0 Discovering=false"}));
}

TEST_F(DiscoveryTest, ADeviceIsFoundAgainWhenItChanges) {
    setTimes("'Inquiry': <60000000>"); // one round that does not end
    addDevice(phone);
    client->call(adapter, "Adapter.StartDiscovery");
    EXPECT_EQ(client->until(found).back(),
              found + "{'Address': <'00:11:22:33:44:55'>, 'Class': <0>, 'RSSI': <-60>, 'Alias': "
                      "<'00-11-22-33-44-55'>, 'LegacyPairing': <false>, 'Paired': <false>, "
                      "'Trusted': <false>}");
    setDevice(phone, "'RSSI': <int16 -50>");
    setDevice(phone, "'Name': <'Late'>, 'Class': <uint32 0x002540>");
    setDevice(phone, "'PIN': <'1'>"); // nothing that shows
    const Lines lines = client->taken();
    ASSERT_EQ(lines.size(), 2U);
    EXPECT_NE(lines[0].find("'RSSI': <-50>"), std::string::npos) << lines[0];
    EXPECT_NE(lines[1].find("'Icon': <'input-keyboard'>, 'RSSI': <-50>, 'Name': <'Late'>"),
              std::string::npos)
        << lines[1];
}

TEST_F(DiscoveryTest, NamesThatDoNotComeWithTheInquiryAreAskedForAfterIt) {
    addDevice(phone, "'Name': <'Keyboard'>, 'NameInInquiry': <false>");
    client->call(adapter, "Adapter.StartDiscovery");
    const Lines lines = client->until("hci0 Discovering=false");
    ASSERT_EQ(lines.size(), 4U);
    EXPECT_EQ(lines[1].find("'Name'"), std::string::npos) << lines[1];
    EXPECT_NE(lines[2].find("'Name': <'Keyboard'>"), std::string::npos) << lines[2];
}

TEST_F(DiscoveryTest, WhatIsMissingForAWholeRoundHasDisappeared) {
    addDevice(phone);
    client->call(adapter, "Adapter.StartDiscovery");
    client->until(found);
    client->control("RemoveDevice", "('00:11:22:33:44:55',)");
    EXPECT_EQ(client->until("hci0 DeviceDisappeared '00:11:22:33:44:55'"),
              (Lines{"hci0 Discovering=false", "hci0 Discovering=true", "hci0 Discovering=false",
                     "hci0 DeviceDisappeared '00:11:22:33:44:55'"}));
    addDevice(phone);
    client->until(found);
}

TEST_F(DiscoveryTest, AVanishingDeviceGoesByItself) {
    addDevice(phone, "'Behaviour': <'Vanishing'>");
    client->call(adapter, "Adapter.StartDiscovery");
    client->until("hci0 DeviceDisappeared '00:11:22:33:44:55'");
}

TEST_F(DiscoveryTest, SessionsAreCountedForEachClient) {
    setTimes("'Inquiry': <60000000>");
    auto other = std::make_unique<SimClient>();
    const std::string none = "error org.bluez.Error.Failed: Invalid discovery session";
    EXPECT_EQ(other->call(adapter, "Adapter.StartDiscovery"), "reply");
    EXPECT_EQ(other->call(adapter, "Adapter.StartDiscovery"), "reply");
    EXPECT_EQ(client->call(adapter, "Adapter.StopDiscovery"), none);
    EXPECT_EQ(client->call(adapter, "Adapter.StartDiscovery"), "reply");
    client->taken();

    EXPECT_EQ(client->call(adapter, "Adapter.StopDiscovery"), "reply");
    EXPECT_EQ(client->taken(), Lines{});
    EXPECT_EQ(client->call(adapter, "Adapter.StopDiscovery"), none);
    const std::string name = other->uniqueName();
    other.reset();
    client->awaitEnd(name);
    EXPECT_EQ(client->taken(), (Lines{"hci0 Discovering=false"}));
}

TEST_F(DiscoveryTest, ANewDiscoveryFindsEverythingAgain) {
    setTimes("'Inquiry': <60000000>");
    addDevice(phone);
    client->call(adapter, "Adapter.StartDiscovery");
    client->until(found);
    client->start("stop", adapter, "Adapter.StopDiscovery");
    EXPECT_EQ(client->until("hci0 Discovering=false"),
              (Lines{"reply stop", "hci0 Discovering=false"}));
    client->call(adapter, "Adapter.StartDiscovery");
    client->until(found);
}

TEST_F(DiscoveryTest, CreatingADeviceSuspendsIt) {
    setTimes("'Inquiry': <60000000>");
    addDevice(phone);
    addDevice("00:11:22:33:44:66", "'Adapter': <'hci0'>");
    client->call(adapter, "Adapter.StartDiscovery");
    client->until("hci0 DeviceFound '00:11:22:33:44:66'");
    client->start("create", adapter, "Adapter.CreateDevice", "('00:11:22:33:44:55',)");
    EXPECT_EQ(client->until("reply create"),
              (Lines{"hci0 DeviceCreated 'hci0/dev_00_11_22_33_44_55'",
                     "hci0 Devices=['hci0/dev_00_11_22_33_44_55']", "hci0 Discovering=false",
                     "dev_00_11_22_33_44_55 Connected=true",
                     "reply create 'hci0/dev_00_11_22_33_44_55'"}));
    EXPECT_EQ(client->until("hci0 DeviceFound '00:11:22:33:44:66'").size(), 3U);
}

TEST_F(DiscoveryTest, PowerOffEndsIt) {
    client->call(adapter, "Adapter.StartDiscovery");
    client->until("hci0 Discovering=true");
    client->start("off", adapter, "Adapter.SetProperty", "('Powered', <false>)");
    EXPECT_EQ(client->until("reply off"), (Lines{"hci0 Pairable=false", "hci0 Discovering=false",
                                                 "hci0 Powered=false", "reply off"}));
}

} // namespace

} // namespace Bluetooth::Test
