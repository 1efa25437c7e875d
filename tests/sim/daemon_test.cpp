#include "sim/sim_test.h"

#include <csignal>

namespace Bluetooth::Test {

namespace {

using SimDaemonTest = SimTest;

const std::string noMethod = "error org.freedesktop.DBus.Error.UnknownMethod: Method ";
const std::string noObject = "error org.freedesktop.DBus.Error.UnknownObject: Method ";

TEST_F(SimDaemonTest, PropertiesHaveTheirOrderAndTypesAndWhatIsMissingTheErrorsOfLibdbus) {
    EXPECT_EQ(client->call("Adapter.GetProperties"),
              "reply {'Address': <'00:1A:7D:DA:71:10'>, 'Name': <'first'>, 'Class': <7209216>, "
              "'Powered': <true>, 'Discoverable': <false>, 'Pairable': <true>, "
              "'DiscoverableTimeout': <180>, 'PairableTimeout': <0>, 'Discovering': <false>, "
              "'Devices': <[]>, 'UUIDs': <[]>}");
    EXPECT_EQ(client->call("Manager.GetProperties"), "reply {'Adapters': <['hci0', 'hci1']>}");
    const auto missing = [](const char* method, const char* signature, const char* interface) {
        return std::string("\"") + method + "\" with signature \"" + signature +
               "\" on interface \"org.bluez." + interface + "\" doesn't exist\n";
    };
    EXPECT_EQ(client->call("Manager.FindAdapter", "(uint32 1,)"),
              noMethod + missing("FindAdapter", "u", "Manager"));
    EXPECT_EQ(client->call("Manager.Nothing"), noMethod + missing("Nothing", "", "Manager"));
    EXPECT_EQ(client->call("Device.GetProperties", "()", base + "hci0"),
              noMethod + missing("GetProperties", "", "Device"));
    EXPECT_EQ(client->call("Device.GetProperties"),
              noObject + missing("GetProperties", "", "Device"));
}

TEST_F(SimDaemonTest, FindAdapterKnowsNamesAndAddressesButNoPaths) {
    const std::string no = "error NoSuchAdapter: No such adapter";
    const std::pair<std::string, std::string> cases[] = {{"hci1", "reply 'hci1'"},
                                                         {"00:1a:7d:da:71:11", "reply 'hci1'"},
                                                         {"any", "reply 'any'"},
                                                         {base + "hci0", no},
                                                         {"hci9", no},
                                                         {"", no}};
    for (const auto& [pattern, answer] : cases)
        EXPECT_EQ(client->call("Manager.FindAdapter", "('" + pattern + "',)"), answer) << pattern;
    EXPECT_EQ(client->call("Adapter.GetProperties", "()", base + "any").find(noMethod), 0U);
}

TEST_F(SimDaemonTest, PropertiesSayWhatTheyBecameBeforeOrAfterTheReply) {
    EXPECT_EQ(set("Name", "'new'"), lines("reply set", "hci0 Name='new'"));
    EXPECT_EQ(set("Name", "'new'"), lines("reply set"));
    const std::string longName(247, 'x'); // names are cut between characters
    EXPECT_EQ(set("Name", "'" + longName + "äö'").back(), "hci0 Name='" + longName + "'");
    EXPECT_EQ(set("Pairable", "false"), lines("hci0 Pairable=false", "reply set"));
    EXPECT_EQ(set("PairableTimeout", "uint32 9"), lines("hci0 PairableTimeout=9", "reply set"));
    EXPECT_EQ(set("DiscoverableTimeout", "uint32 0"),
              lines("hci0 DiscoverableTimeout=0", "reply set"));
    EXPECT_EQ(set("Discoverable", "true"), lines("hci0 Discoverable=true", "reply set"));
    EXPECT_EQ(set("Powered", "false"), lines("hci0 Discoverable=false", "hci0 Pairable=false",
                                             "hci0 Powered=false", "reply set"));
    EXPECT_EQ(set("Powered", "true"),
              lines("hci0 Powered=true", "hci0 Pairable=false", "hci0 Class=7209216",
                    "hci0 Pairable=false", "hci0 Discoverable=true", "reply set"));
    EXPECT_EQ(set("Powered", "true"), lines("reply set"));
    for (const auto& [name, value] :
         {std::pair("Address", "'x'"), std::pair("Nothing", "'x'"),
          std::pair("DiscoverableTimeout", "int32 5"), std::pair("Powered", "'true'")})
        EXPECT_EQ(set(name, value), lines("error set " + badArguments)) << name;
}

TEST_F(SimDaemonTest, DiscoverableTurnsTheAdapterOnAndEndsByItself) {
    set("Powered", "false");
    set("DiscoverableTimeout", "uint32 2");
    EXPECT_EQ(
        client->trace("Adapter.SetProperty", "('Discoverable', <true>)", "hci0 Class=7209216"),
        lines("hci0 Powered=true", "hci0 Pairable=true", "hci0 Discoverable=true", "reply call",
              "hci0 Class=7217408", "hci0 Discoverable=false", "hci0 Class=7209216"));
    set("Pairable", "false");
    set("PairableTimeout", "uint32 2"); // so does Pairable
    EXPECT_EQ(client->trace("Adapter.SetProperty", "('Pairable', <true>)", "hci0 Pairable=false"),
              lines("hci0 Pairable=true", "reply call", "hci0 Pairable=false"));
}

TEST_F(SimDaemonTest, AnAdapterThatIsOffIsNotReadyForTheAir) {
    set("Powered", "false");
    for (const auto& [method, arguments] :
         {std::pair<std::string, std::string>("StartDiscovery", "()"),
          {"StopDiscovery", "()"},
          {"CreateDevice", byAddress},
          {"CreatePairedDevice", "('00:11:22:33:44:55', objectpath '/agent', '')"}})
        EXPECT_EQ(client->call("Adapter." + method, arguments),
                  "error NotReady: Resource Not Ready");
    EXPECT_EQ(client->call("Adapter.ListDevices"), "reply []");
}

TEST_F(SimDaemonTest, AdaptersComeAndGoInTheOrderOfTheDaemon) {
    EXPECT_EQ(client->control("AddAdapter", "(@a{sv} {'Name': <'third'>},)"), "reply 'hci2'");
    EXPECT_EQ(client->taken(),
              lines("hci0 UUIDs=[]", "hci0 UUIDs=[]", "hci1 UUIDs=[]", "hci1 UUIDs=[]",
                    "/ AdapterAdded 'hci2'", "/ Adapters=['hci0', 'hci1', 'hci2']",
                    "hci2 Powered=true", "hci2 Pairable=true", "hci2 Class=7209216",
                    "hci2 Name='third'", "hci2 Pairable=true", "hci2 Discoverable=false"));
    client->control("RemoveAdapter", "('hci0',)");
    EXPECT_EQ(client->taken(),
              lines("hci0 Pairable=false", "hci0 Powered=false", "/ Adapters=['hci1', 'hci2']",
                    "/ DefaultAdapterChanged 'hci1'", "/ AdapterRemoved 'hci0'"));
    client->control("RemoveAdapter", "('hci1',)");
    client->control("RemoveAdapter", "('hci2',)");
    EXPECT_EQ(client->taken().back(), "/ AdapterRemoved 'hci2'");
    EXPECT_EQ(client->call("Manager.DefaultAdapter"), "error NoSuchAdapter: No such adapter");
    EXPECT_EQ(client->call("Manager.ListAdapters"), "reply []");
}

TEST_F(SimDaemonTest, ARestartChangesAllPathsAndKeepsStoredDevices) {
    create();
    registerAgent();
    client->taken();
    client->control("Restart");
    const Texts came = client->taken();
    EXPECT_EQ(came.front(), "agent Release");
    EXPECT_EQ(came[1], "/ AdapterAdded 'hci0'");
    EXPECT_NE(client->base(), base);
    EXPECT_EQ(client->call("Adapter.ListDevices", "()", base + "hci0").find(noObject), 0U);
    EXPECT_EQ(client->call("Adapter.ListDevices"), "reply [phone]");
}

TEST_F(SimDaemonTest, ADroppedNameTakesCallsUnderWayWithItAndComesBack) {
    simulation.delayNext("org.bluez.Adapter", "ListDevices", 60000);
    client->start("late", "Adapter.ListDevices");
    client->control("DropName");
    EXPECT_EQ(client->until("error late"),
              lines("error late org.freedesktop.DBus.Error.NoReply: Message recipient "
                    "disconnected from message bus without replying"));
    EXPECT_EQ(client->call("Manager.ListAdapters"),
              "error org.freedesktop.DBus.Error.ServiceUnknown: The name org.bluez was not "
              "provided by any .service files");
    client->control("RegainName");
    EXPECT_EQ(client->base(), base);
}

TEST_F(SimDaemonTest, SigtermReleasesTheAgentsAndASecondDaemonIsRefused) {
    ChildProcess second({BLUEZ4_SIM}, ChildProcess::Output::Capture);
    EXPECT_EQ(second.wait(), 1);
    EXPECT_EQ(second.readAll(), "");
    EXPECT_EQ(second.readErrors(),
              "bluez4-sim: com.kestrine.bluetooth.Sim is already owned on this bus; stop its owner "
              "first; or give it buses of its own: bluez4-sim -- COMMAND\n");
    registerAgent();
    client->taken();
    daemon.signal(SIGTERM);
    EXPECT_EQ(daemon.wait(), 0);
    EXPECT_EQ(client->until("agent"), lines("agent Release"));
    client->call("org.freedesktop.DBus.GetId");
    EXPECT_EQ(client->taken(), Texts{});
}

TEST_F(SimDaemonTest, SessionsPowerTheAdapterWithTheAgentsConsent) {
    EXPECT_EQ(client->call("Adapter.RequestSession"),
              "error AgentNotAvailable: Agent Not Available");
    registerAgent();
    EXPECT_EQ(client->call("Adapter.RequestSession"), "reply"); // it is on
    EXPECT_EQ(client->call("Adapter.ReleaseSession"), "reply");
    set("Powered", "false");
    client->agentAnswers("ConfirmModeChange", "!org.bluez.Error.Rejected");
    EXPECT_EQ(client->call("Adapter.RequestSession"), "error Rejected: said no");
    client->agentAnswers("ConfirmModeChange", "");
    EXPECT_EQ(client->trace("Adapter.RequestSession").front(),
              "agent ConfirmModeChange 'connectable'");
    EXPECT_EQ(client->trace("Adapter.ReleaseSession", "()", "hci0 Powered=false"),
              lines("reply call", "hci0 Pairable=false", "hci0 Powered=false"));
    EXPECT_EQ(client->call("Adapter.ReleaseSession"), "error Failed: Invalid Session");
}

TEST_F(SimDaemonTest, OneAgentForEachAdapterUntilItsOwnerUnregistersItOrLeaves) {
    auto other = std::make_unique<SimClient>();
    other->base();
    const std::string registering = "Adapter.RegisterAgent";
    EXPECT_EQ(other->call(registering, "(objectpath '/agent', 'Telepathy')"),
              "error " + badArguments);
    EXPECT_EQ(other->call(registering, "(objectpath '/agent', 'KeyboardDisplay')"), "reply");
    EXPECT_EQ(client->call(registering, agent), "error AlreadyExists: Already Exists");
    EXPECT_EQ(client->call("Adapter.UnregisterAgent", "(objectpath '/agent',)"),
              "error DoesNotExist: Does Not Exist");
    leave(other);
    EXPECT_EQ(client->call(registering, "(objectpath '/agent', 'KeyboardOnly')"), "reply");
    EXPECT_EQ(client->trace("Adapter.UnregisterAgent", "(objectpath '/agent',)"),
              lines("agent Release", "reply call"));
}

} // namespace

} // namespace Bluetooth::Test
