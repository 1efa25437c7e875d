// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

namespace Bluetooth::Test {

class DiscoveryTest : public SimTest {
protected:
    void makeInquiryEndless() { setTime("Inquiry", "60000000"); }

    const std::string found = "hci0 DeviceFound s:00:11:22:33:44:55 ";
    const std::string foundOther = "hci0 DeviceFound s:00:11:22:33:44:66 ";
    const std::string begins = "hci0 Discovering=b:1";
    const std::string ends = "hci0 Discovering=b:0";
};

TEST_F(DiscoveryTest, ADeviceIsFoundOnceWithItsValuesInOrder) {
    control({"AddDevice", newDevice, [](Writer& w) { // values may have types of their own
                 w.dict("sv", [](Writer& d) {
                     d.entry("Name", Var{"Phone"}).entry("Class", Var{0x5a020cU});
                     d.entryWith("UUIDs", [](Writer& uuids) {
                         uuids.variant("as", [](Writer& v) { v.array("s", with("110a", "1112")); });
                     });
                     d.entry("RSSI", Var{std::int16_t{-48}});
                     d.entry("LegacyPairing", Var{true});
                 });
             }});
    EXPECT_EQ(trace("Adapter.StartDiscovery", ends),
              lines("answer StartDiscovery", begins,
                    found + "a(e(s:Address v(s:00:11:22:33:44:55)) e(s:Class v(u:5898764)) "
                            "e(s:Icon v(s:phone)) e(s:RSSI v(n:-48)) e(s:Name v(s:Phone)) "
                            "e(s:Alias v(s:Phone)) e(s:LegacyPairing v(b:1)) e(s:Paired v(b:0)) "
                            "e(s:Trusted v(b:0)) e(s:UUIDs v(a("
                            "s:0000110a-0000-1000-8000-00805f9b34fb "
                            "s:00001112-0000-1000-8000-00805f9b34fb))))",
                    ends));
    EXPECT_EQ(until(ends), lines(begins, ends));
}

TEST_F(DiscoveryTest, ADeviceIsFoundAgainWhenItChanges) {
    makeInquiryEndless();
    add();
    EXPECT_EQ(trace("Adapter.StartDiscovery", found).back(),
              found + "a(e(s:Address v(s:00:11:22:33:44:55)) e(s:Class v(u:0)) e(s:RSSI v(n:-60)) "
                      "e(s:Alias v(s:00-11-22-33-44-55)) e(s:LegacyPairing v(b:0)) "
                      "e(s:Paired v(b:0)) e(s:Trusted v(b:0)))");
    // The last changes nothing that shows.
    for (const Settings& change :
         {Settings{{"RSSI", "-50"}}, {{"Name", "Late"}, {"Class", "0x002540"}}, {{"PIN", "1"}}})
        control({"SetDevice", newDevice, change});
    const Texts came = taken();
    ASSERT_EQ(came.size(), 2U);
    EXPECT_NE(came[0].find("(s:RSSI v(n:-50))"), std::string::npos) << came[0];
    EXPECT_NE(came[1].find("e(s:Icon v(s:input-keyboard)) e(s:RSSI v(n:-50)) e(s:Name v(s:Late))"),
              std::string::npos)
        << came[1];
}

TEST_F(DiscoveryTest, NamesThatDoNotComeWithTheInquiryAreAskedForAfterIt) {
    add({{"Name", "Keyboard"}, {"NameInInquiry", "false"}});
    const Texts came = trace("Adapter.StartDiscovery", ends);
    ASSERT_EQ(came.size(), 5U);
    EXPECT_EQ(came[2].find("s:Name"), std::string::npos) << came[2];
    EXPECT_NE(came[3].find("(s:Name v(s:Keyboard))"), std::string::npos) << came[3];
}

TEST_F(DiscoveryTest, WhatIsMissingForAWholeRoundHasDisappeared) {
    const std::string disappeared = "hci0 DeviceDisappeared s:";
    add();
    add({{"Behaviour", "Vanishing"}}, otherDevice);
    trace("Adapter.StartDiscovery", disappeared + otherDevice);
    control({"RemoveDevice", newDevice});
    taken();
    const Texts came = until(disappeared + newDevice);
    EXPECT_EQ(came[came.size() - 2], ends);
    add();
    until(found);
}

TEST_F(DiscoveryTest, SessionsAreCountedForEachClientAndANewDiscoveryFindsEverythingAgain) {
    makeInquiryEndless();
    add();
    auto other = std::make_unique<SimClient>();
    const std::string none = "error Failed: Invalid discovery session";
    EXPECT_EQ(other->call("Adapter.StartDiscovery"), "");
    EXPECT_EQ(other->call("Adapter.StartDiscovery"), "");
    EXPECT_EQ(call("Adapter.StopDiscovery"), none);
    EXPECT_EQ(call("Adapter.StartDiscovery"), "");
    until(found);
    EXPECT_EQ(trace("Adapter.StopDiscovery"), lines("answer StopDiscovery"));
    EXPECT_EQ(call("Adapter.StopDiscovery"), none);
    leave(other);
    EXPECT_EQ(taken(), lines(ends));

    trace("Adapter.StartDiscovery", found);
    EXPECT_EQ(trace("Adapter.StopDiscovery", ends), lines("answer StopDiscovery", ends));
}

TEST_F(DiscoveryTest, CreatingADeviceSuspendsItAndPowerOffEndsIt) {
    makeInquiryEndless();
    add();
    add({{"Adapter", "hci0"}}, otherDevice);
    trace("Adapter.StartDiscovery", foundOther);
    EXPECT_EQ(trace({"Adapter.CreateDevice", newDevice}),
              created + lines(ends, "device Connected=b:1", "answer CreateDevice o:device"));
    EXPECT_EQ(until(foundOther).size(), 3U);
    const Texts off = set("Powered", false);
    EXPECT_EQ(Texts(off.end() - 4, off.end()),
              lines("hci0 Pairable=b:0", ends, "hci0 Powered=b:0", "answer SetProperty"));
}

} // namespace Bluetooth::Test
