#include "sim/sim_test.h"

namespace Bluetooth::Test {

namespace {

using DiscoveryTest = SimTest;

const std::string found = "hci0 DeviceFound '00:11:22:33:44:55' ";
const char* const endless = "'Inquiry': <60000000>"; // one round that does not end

TEST_F(DiscoveryTest, ADeviceIsFoundOnceWithItsValuesInOrder) {
    add("'Name': <'Phone'>, 'Class': <uint32 0x5a020c>, 'UUIDs': <['110a', '1112']>, "
        "'RSSI': <int16 -48>, 'LegacyPairing': <true>");
    EXPECT_EQ(client->trace("Adapter.StartDiscovery", "()", "hci0 Discovering=false"),
              lines("reply call", "hci0 Discovering=true",
                    found + "{'Address': <'00:11:22:33:44:55'>, 'Class': <5898764>, "
                            "'Icon': <'phone'>, 'RSSI': <-48>, 'Name': <'Phone'>, "
                            "'Alias': <'Phone'>, 'LegacyPairing': <true>, 'Paired': <false>, "
                            "'Trusted': <false>, 'UUIDs': "
                            "<['0000110a-0000-1000-8000-00805f9b34fb', "
                            "'00001112-0000-1000-8000-00805f9b34fb']>}",
                    "hci0 Discovering=false"));
    EXPECT_EQ(client->until("hci0 Discovering=false"),
              lines("hci0 Discovering=true", "hci0 Discovering=false"));
}

TEST_F(DiscoveryTest, ADeviceIsFoundAgainWhenItChanges) {
    setTimes(endless);
    add();
    EXPECT_EQ(client->trace("Adapter.StartDiscovery", "()", found).back(),
              found + "{'Address': <'00:11:22:33:44:55'>, 'Class': <0>, 'RSSI': <-60>, 'Alias': "
                      "<'00-11-22-33-44-55'>, 'LegacyPairing': <false>, 'Paired': <false>, "
                      "'Trusted': <false>}");
    // The last changes nothing that shows.
    for (const char* change :
         {"'RSSI': <int16 -50>", "'Name': <'Late'>, 'Class': <uint32 0x002540>", "'PIN': <'1'>"})
        client->control("SetDevice", std::string("('00:11:22:33:44:55', {") + change + "})");
    const Texts came = client->taken();
    ASSERT_EQ(came.size(), 2U);
    EXPECT_NE(came[0].find("'RSSI': <-50>"), std::string::npos) << came[0];
    EXPECT_NE(came[1].find("'Icon': <'input-keyboard'>, 'RSSI': <-50>, 'Name': <'Late'>"),
              std::string::npos)
        << came[1];
}

TEST_F(DiscoveryTest, NamesThatDoNotComeWithTheInquiryAreAskedForAfterIt) {
    add("'Name': <'Keyboard'>, 'NameInInquiry': <false>");
    const Texts came = client->trace("Adapter.StartDiscovery", "()", "hci0 Discovering=false");
    ASSERT_EQ(came.size(), 5U);
    EXPECT_EQ(came[2].find("'Name'"), std::string::npos) << came[2];
    EXPECT_NE(came[3].find("'Name': <'Keyboard'>"), std::string::npos) << came[3];
}

TEST_F(DiscoveryTest, WhatIsMissingForAWholeRoundHasDisappeared) {
    add();
    add("'Behaviour': <'Vanishing'>", "00:11:22:33:44:66");
    client->trace("Adapter.StartDiscovery", "()", "hci0 DeviceDisappeared '00:11:22:33:44:66'");
    client->control("RemoveDevice", byAddress);
    client->taken();
    const Texts came = client->until("hci0 DeviceDisappeared '00:11:22:33:44:55'");
    EXPECT_EQ(came[came.size() - 2], "hci0 Discovering=false");
    add();
    client->until(found);
}

TEST_F(DiscoveryTest, SessionsAreCountedForEachClientAndANewDiscoveryFindsEverythingAgain) {
    setTimes(endless);
    add();
    auto other = std::make_unique<SimClient>();
    other->base();
    const std::string none = "error Failed: Invalid discovery session";
    EXPECT_EQ(other->call("Adapter.StartDiscovery"), "reply");
    EXPECT_EQ(other->call("Adapter.StartDiscovery"), "reply");
    EXPECT_EQ(client->call("Adapter.StopDiscovery"), none);
    EXPECT_EQ(client->call("Adapter.StartDiscovery"), "reply");
    client->until(found);
    EXPECT_EQ(client->trace("Adapter.StopDiscovery"), lines("reply call"));
    EXPECT_EQ(client->call("Adapter.StopDiscovery"), none);
    leave(other);
    EXPECT_EQ(client->taken(), lines("hci0 Discovering=false"));

    client->trace("Adapter.StartDiscovery", "()", found);
    EXPECT_EQ(client->trace("Adapter.StopDiscovery", "()", "hci0 Discovering=false"),
              lines("reply call", "hci0 Discovering=false"));
}

TEST_F(DiscoveryTest, CreatingADeviceSuspendsItAndPowerOffEndsIt) {
    setTimes(endless);
    add();
    add("'Adapter': <'hci0'>", "00:11:22:33:44:66");
    client->trace("Adapter.StartDiscovery", "()", "hci0 DeviceFound '00:11:22:33:44:66'");
    EXPECT_EQ(client->trace("Adapter.CreateDevice", byAddress),
              created +
                  lines("hci0 Discovering=false", "phone Connected=true", "reply call phone"));
    EXPECT_EQ(client->until("hci0 DeviceFound '00:11:22:33:44:66'").size(), 3U);
    const Texts off = set("Powered", "false");
    EXPECT_EQ(
        Texts(off.end() - 4, off.end()),
        lines("hci0 Pairable=false", "hci0 Discovering=false", "hci0 Powered=false", "reply set"));
}

} // namespace

} // namespace Bluetooth::Test
