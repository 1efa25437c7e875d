#include "sim/sim_fixture.h"

#include <csignal>

namespace Bluetooth::Test {

namespace {

using DaemonTest = SimTest;

const std::string unknown = "error org.freedesktop.DBus.Error.UnknownMethod: ";

TEST_F(DaemonTest, AdapterPropertiesHaveTheirOrderAndTypes) {
    EXPECT_EQ(client->call(adapter, "Adapter.GetProperties"),
              "reply {'Address': <'00:1A:7D:DA:71:10'>, 'Name': <'first'>, 'Class': <7209216>, "
              "'Powered': <true>, 'Discoverable': <false>, 'Pairable': <true>, "
              "'DiscoverableTimeout': <180>, 'PairableTimeout': <0>, 'Discovering': <false>, "
              "'Devices': <[]>, 'UUIDs': <[]>}");
    EXPECT_EQ(client->call("/", "Manager.GetProperties"), "reply {'Adapters': <['hci0', 'hci1']>}");
    EXPECT_EQ(client->call(adapter, "Adapter.ListDevices"), "reply []");
}

TEST_F(DaemonTest, WhatDoesNotExistIsAnsweredAsByLibdbus) {
    EXPECT_EQ(client->call("/", "Manager.FindAdapter", "(uint32 1,)"),
              unknown + "Method \"FindAdapter\" with signature \"u\" on interface "
                        "\"org.bluez.Manager\" doesn't exist\n");
    EXPECT_EQ(client->call("/", "Manager.Nothing"),
              unknown + "Method \"Nothing\" with signature \"\" on interface "
                        "\"org.bluez.Manager\" doesn't exist\n");
    EXPECT_EQ(client->call(adapter, "Device.GetProperties").substr(0, unknown.size()), unknown);
    EXPECT_EQ(client->call(devicePath(), "Device.GetProperties"),
              "error org.freedesktop.DBus.Error.UnknownObject: Method \"GetProperties\" with "
              "signature \"\" on interface \"org.bluez.Device\" doesn't exist\n");
}

TEST_F(DaemonTest, FindAdapterKnowsNamesAndAddressesButNoPaths) {
    const auto find = [&](const std::string& pattern) {
        return client->call("/", "Manager.FindAdapter", "('" + pattern + "',)");
    };
    const std::string no = "error org.bluez.Error.NoSuchAdapter: No such adapter";
    EXPECT_EQ(find("hci1"), "reply 'hci1'");
    EXPECT_EQ(find("00:1a:7d:da:71:11"), "reply 'hci1'");
    EXPECT_EQ(find("any"), "reply 'any'");
    EXPECT_EQ(client->call(base + "any", "Adapter.GetProperties").substr(0, unknown.size()),
              unknown);
    for (const std::string& pattern :
         {adapter, std::string("hci9"), std::string("junk"), std::string("")})
        EXPECT_EQ(find(pattern), no) << pattern;
}

TEST_F(DaemonTest, PropertiesSayWhatTheyBecameBeforeOrAfterTheReply) {
    const auto set = [&](const char* name, const char* value) {
        client->start("set", adapter, "Adapter.SetProperty",
                      std::string("('") + name + "', <" + value + ">)");
        client->control("ClearFaults"); // answered after all that the call brought about
        return client->taken();
    };
    EXPECT_EQ(set("Name", "'new'"), (Lines{"reply set", "hci0 Name='new'"}));
    EXPECT_EQ(set("Name", "'new'"), (Lines{"reply set"}));
    EXPECT_EQ(set("Pairable", "false"), (Lines{"hci0 Pairable=false", "reply set"}));
    EXPECT_EQ(set("PairableTimeout", "uint32 9"), (Lines{"hci0 PairableTimeout=9", "reply set"}));
    EXPECT_EQ(set("DiscoverableTimeout", "uint32 0"),
              (Lines{"hci0 DiscoverableTimeout=0", "reply set"}));
    EXPECT_EQ(set("Discoverable", "true"), (Lines{"hci0 Discoverable=true", "reply set"}));
    EXPECT_EQ(set("Powered", "false"), (Lines{"hci0 Discoverable=false", "hci0 Pairable=false",
                                              "hci0 Powered=false", "reply set"}));
    EXPECT_EQ(set("Powered", "true"),
              (Lines{"hci0 Powered=true", "hci0 Pairable=false", "hci0 Class=7209216",
                     "hci0 Pairable=false", "hci0 Discoverable=true", "reply set"}));
    EXPECT_EQ(set("Powered", "true"), (Lines{"reply set"}));

    const Lines refused = {
        "error set org.bluez.Error.InvalidArguments: Invalid arguments in method call"};
    EXPECT_EQ(set("Address", "'x'"), refused);
    EXPECT_EQ(set("Nothing", "'x'"), refused);
    EXPECT_EQ(set("DiscoverableTimeout", "int32 5"), refused);
    EXPECT_EQ(set("Powered", "'true'"), refused);
}

TEST_F(DaemonTest, LongNamesAreCutBetweenCharacters) {
    std::string name(247, 'x');
    EXPECT_EQ(setProperty(adapter, "Adapter", "Name", "'" + name + "äö'"), "reply");
    EXPECT_EQ(client->until("hci0 Name"), (Lines{"hci0 Name='" + name + "'"}));
}

TEST_F(DaemonTest, DiscoverableTurnsTheAdapterOnAndEndsByItself) {
    setProperty(adapter, "Adapter", "Powered", "false");
    setProperty(adapter, "Adapter", "DiscoverableTimeout", "uint32 2");
    client->taken();
    client->start("set", adapter, "Adapter.SetProperty", "('Discoverable', <true>)");
    EXPECT_EQ(
        client->until("hci0 Class=7209216"),
        (Lines{"hci0 Powered=true", "hci0 Pairable=true", "hci0 Discoverable=true", "reply set",
               "hci0 Class=7217408", "hci0 Discoverable=false", "hci0 Class=7209216"}));
}

TEST_F(DaemonTest, AnAdapterThatIsOffIsNotReadyForTheAir) {
    setProperty(adapter, "Adapter", "Powered", "false");
    const std::string notReady = "error org.bluez.Error.NotReady: Resource Not Ready";
    EXPECT_EQ(client->call(adapter, "Adapter.StartDiscovery"), notReady);
    EXPECT_EQ(client->call(adapter, "Adapter.StopDiscovery"), notReady);
    EXPECT_EQ(createDevice(phone), notReady);
    EXPECT_EQ(client->call(adapter, "Adapter.CreatePairedDevice",
                           "('00:11:22:33:44:55', objectpath '/agent', '')"),
              notReady);
    EXPECT_EQ(client->call(adapter, "Adapter.ListDevices"), "reply []");
}

TEST_F(DaemonTest, AdaptersComeAndGoInTheOrderOfTheDaemon) {
    EXPECT_EQ(client->control("AddAdapter", "(@a{sv} {'Name': <'third'>},)"), "reply 'hci2'");
    EXPECT_EQ(client->taken(),
              (Lines{"hci0 UUIDs=[]", "hci0 UUIDs=[]", "hci1 UUIDs=[]", "hci1 UUIDs=[]",
                     "/ AdapterAdded 'hci2'", "/ Adapters=['hci0', 'hci1', 'hci2']",
                     "hci2 Powered=true", "hci2 Pairable=true", "hci2 Class=7209216",
                     "hci2 Name='third'", "hci2 Pairable=true", "hci2 Discoverable=false"}));
    client->control("RemoveAdapter", "('hci0',)");
    EXPECT_EQ(client->taken(),
              (Lines{"hci0 Pairable=false", "hci0 Powered=false", "/ Adapters=['hci1', 'hci2']",
                     "/ DefaultAdapterChanged 'hci1'", "/ AdapterRemoved 'hci0'"}));
    client->control("RemoveAdapter", "('hci1',)");
    client->control("RemoveAdapter", "('hci2',)");
    const Lines lines = client->taken();
    EXPECT_EQ(lines.back(), "/ AdapterRemoved 'hci2'");
    EXPECT_EQ(client->call("/", "Manager.DefaultAdapter"),
              "error org.bluez.Error.NoSuchAdapter: No such adapter");
    EXPECT_EQ(client->call("/", "Manager.ListAdapters"), "reply []");
}

TEST_F(DaemonTest, ARestartChangesAllPathsAndKeepsStoredDevices) {
    addDevice(phone);
    createDevice(phone);
    client->agentAnswers("Release", "");
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    client->taken();
    client->control("Restart");
    const Lines lines = client->taken();
    EXPECT_EQ(lines.front(), "agent Release");
    EXPECT_EQ(lines[1], "/ AdapterAdded 'hci0'");
    EXPECT_NE(client->base(), base);
    EXPECT_EQ(client->call(adapter, "Adapter.ListDevices").substr(0, 49),
              "error org.freedesktop.DBus.Error.UnknownObject: M");
    EXPECT_EQ(client->call(client->base() + "hci0", "Adapter.ListDevices"),
              "reply ['hci0/dev_00_11_22_33_44_55']");
}

TEST_F(DaemonTest, ADroppedNameTakesCallsUnderWayWithItAndComesBack) {
    client->control("DelayNext", "('org.bluez.Adapter', 'ListDevices', uint32 60000)");
    client->start("late", adapter, "Adapter.ListDevices");
    client->control("DropName");
    EXPECT_EQ(client->until("error late"),
              (Lines{"error late org.freedesktop.DBus.Error.NoReply: Message recipient "
                     "disconnected from message bus without replying"}));
    EXPECT_EQ(client->call("/", "Manager.ListAdapters"),
              "error org.freedesktop.DBus.Error.ServiceUnknown: The name org.bluez was not "
              "provided by any .service files");
    client->control("RegainName");
    EXPECT_EQ(client->base(), base);
}

TEST_F(DaemonTest, SigtermReleasesTheAgentsAndSaysNothingElse) {
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    client->taken();
    daemon->signal(SIGTERM);
    EXPECT_EQ(daemon->wait(), 0);
    EXPECT_EQ(client->until("agent"), (Lines{"agent Release"}));
    client->call("", "org.freedesktop.DBus.GetId");
    EXPECT_EQ(client->taken(), Lines{});
}

TEST_F(DaemonTest, ASecondDaemonOnTheBusIsRefused) {
    ChildProcess second({BLUEZ4_SIM}, ChildProcess::Output::Capture);
    EXPECT_EQ(second.wait(), 1);
    EXPECT_EQ(second.readAll(), "");
    EXPECT_EQ(second.readErrors(), "bluez4-sim: com.kestrine.bluetooth.Sim is already owned on "
                                   "this bus; stop its owner first\n");
}

TEST_F(DaemonTest, SessionsPowerTheAdapterWithTheAgentsConsent) {
    EXPECT_EQ(client->call(adapter, "Adapter.RequestSession"),
              "error org.bluez.Error.AgentNotAvailable: Agent Not Available");
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    setProperty(adapter, "Adapter", "Powered", "false");
    client->agentAnswers("ConfirmModeChange", "!org.bluez.Error.Rejected");
    EXPECT_EQ(client->call(adapter, "Adapter.RequestSession"),
              "error org.bluez.Error.Rejected: said no");
    client->agentAnswers("ConfirmModeChange", "");
    client->taken();
    client->start("session", adapter, "Adapter.RequestSession");
    EXPECT_EQ(client->until("reply session").front(), "agent ConfirmModeChange 'connectable'");
    client->start("release", adapter, "Adapter.ReleaseSession");
    EXPECT_EQ(client->until("hci0 Powered=false"),
              (Lines{"reply release", "hci0 Pairable=false", "hci0 Powered=false"}));
    EXPECT_EQ(client->call(adapter, "Adapter.ReleaseSession"),
              "error org.bluez.Error.Failed: Invalid Session");
}

TEST_F(DaemonTest, OneAgentForEachAdapterUntilItsOwnerUnregistersItOrLeaves) {
    const auto registerAgent = [&](SimClient& by, const char* arguments) {
        return by.call(adapter, "Adapter.RegisterAgent", arguments);
    };
    auto other = std::make_unique<SimClient>();
    EXPECT_EQ(registerAgent(*other, "(objectpath '/agent', 'Telepathy')"),
              "error org.bluez.Error.InvalidArguments: Invalid arguments in method call");
    EXPECT_EQ(registerAgent(*other, "(objectpath '/agent', 'KeyboardDisplay')"), "reply");
    EXPECT_EQ(registerAgent(*client, "(objectpath '/agent', '')"),
              "error org.bluez.Error.AlreadyExists: Already Exists");
    EXPECT_EQ(client->call(adapter, "Adapter.UnregisterAgent", "(objectpath '/agent',)"),
              "error org.bluez.Error.DoesNotExist: Does Not Exist");
    const std::string name = other->uniqueName();
    other.reset();
    client->awaitEnd(name);
    EXPECT_EQ(registerAgent(*client, "(objectpath '/agent', 'KeyboardOnly')"), "reply");
    client->start("bye", adapter, "Adapter.UnregisterAgent", "(objectpath '/agent',)");
    EXPECT_EQ(client->until("reply bye"), (Lines{"agent Release", "reply bye"}));
}

} // namespace

} // namespace Bluetooth::Test
