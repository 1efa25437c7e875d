// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

#include <csignal>

namespace Bluetooth::Test {

using SimDaemonTest = SimTest;

const std::string noObject = "error org.freedesktop.DBus.Error.UnknownObject: Method ";
const std::string noAdapter = "error NoSuchAdapter: No such adapter";

TEST_F(SimDaemonTest, PropertiesSayWhatTheyBecameBeforeOrAfterTheReply) {
    const std::string answer = "answer SetProperty";
    EXPECT_EQ(set("Name", "new"), lines(answer, "hci0 Name=s:new"));
    EXPECT_EQ(set("Name", "new"), lines(answer));
    const std::string longName(247, 'x'); // names are cut, but in no character
    EXPECT_EQ(set("Name", longName + "xyz").back(), "hci0 Name=s:" + longName + "x");
    EXPECT_EQ(set("Name", longName + "äö"), lines(answer + " " + badArguments));
    EXPECT_EQ(set("Pairable", false), lines("hci0 Pairable=b:0", answer));
    EXPECT_EQ(set("PairableTimeout", 9U), lines("hci0 PairableTimeout=u:9", answer));
    EXPECT_EQ(set("Discoverable", true), lines("hci0 Discoverable=b:1", answer));
    EXPECT_EQ(set("Powered", false), lines("hci0 Discoverable=b:0", "hci0 Powered=b:0", answer));
    EXPECT_EQ(set("Name", "off"), lines(answer));
    EXPECT_EQ(set("Powered", true),
              lines("hci0 Powered=b:1", "hci0 Pairable=b:0", "hci0 Class=u:7209216",
                    "hci0 Pairable=b:0", "hci0 Discoverable=b:1", answer));
    EXPECT_EQ(set("Powered", true), lines(answer));
    const Texts refused{answer + " " + badArguments};
    EXPECT_EQ(set("Address", "x"), refused);
    EXPECT_EQ(set("Nothing", "x"), refused);
    EXPECT_EQ(set("DiscoverableTimeout", 5), refused);
    EXPECT_EQ(set("Powered", "true"), refused);
}

TEST_F(SimDaemonTest, DiscoverableTurnsTheAdapterOnAndEndsByItself) {
    const auto on = [](const char* bits, const char* discoverable) {
        return lines("hci0 Powered=b:1", "hci0 Pairable=b:1", std::string("hci0 Class=u:") + bits,
                     "hci0 Pairable=b:1", std::string("hci0 Discoverable=b:") + discoverable,
                     "answer SetProperty");
    };
    set("Powered", false);
    EXPECT_EQ(set("Discoverable", false), on("7209216", "0"));
    set("Powered", false);
    set("DiscoverableTimeout", 2U);
    EXPECT_EQ(trace({"Adapter.SetProperty", "Discoverable", Var{true}}, "hci0 Class=u:7209216"),
              lines("hci0 Powered=b:1", "hci0 Pairable=b:1", "hci0 Class=u:7217408",
                    "hci0 Pairable=b:1", "hci0 Discoverable=b:1", "answer SetProperty",
                    "hci0 Discoverable=b:0", "hci0 Class=u:7209216"));
    set("Pairable", false);
    set("PairableTimeout", 2U); // so does Pairable
    EXPECT_EQ(trace({"Adapter.SetProperty", "Pairable", Var{true}}, "hci0 Pairable=b:0"),
              lines("hci0 Pairable=b:1", "answer SetProperty", "hci0 Pairable=b:0"));
}

TEST_F(SimDaemonTest, TheClassSaysLimitedOnlyForAShortTimeThatWasSetWhilePairable) {
    const std::string answer = "answer SetProperty";
    const std::string isLimited = "hci0 Class=u:7217408";
    const std::string isNot = "hci0 Class=u:7209216";
    control({"SetTimeScale", 1.0});
    set("DiscoverableTimeout", 60U);
    EXPECT_EQ(set("Discoverable", true), lines("hci0 Discoverable=b:1", answer, isLimited));
    EXPECT_EQ(set("Pairable", false), lines("hci0 Pairable=b:0", answer));
    EXPECT_NE(call("Adapter.GetProperties").find("u:7217408"), std::string::npos);
    EXPECT_EQ(set("DiscoverableTimeout", 60U),
              lines("hci0 DiscoverableTimeout=u:60", answer, isNot));
    set("Pairable", true);
    EXPECT_EQ(set("DiscoverableTimeout", 59U).back(), isLimited);
    EXPECT_EQ(set("DiscoverableTimeout", 61U).back(), isNot);
    EXPECT_EQ(set("DiscoverableTimeout", 0U).back(), answer);
    EXPECT_EQ(set("DiscoverableTimeout", 0U), lines(answer));
    set("DiscoverableTimeout", 30U);
    EXPECT_EQ(set("Discoverable", false), lines("hci0 Discoverable=b:0", answer, isNot));
}

TEST_F(SimDaemonTest, OneChangeOfTheModeIsMadeAtATime) {
    const std::string busy = "error Failed: Operation already in progress";
    const auto startSetting = [&](const char* name, bool value) {
        start({"Adapter.SetProperty", name, Var{value}});
    };
    setTime("ModeChange", "50000");
    startSetting("Discoverable", true);
    for (const Question& question : {Question("Adapter.SetProperty", "Powered", Var{false}),
                                     Question("Adapter.SetProperty", "Discoverable", Var{true})})
        EXPECT_EQ(call(question), busy);
    until("answer");
    setTime("ModeChange", "50");
    startSetting("Powered", false); // this one takes no time
    startSetting("Powered", true);
    until("answer");
    EXPECT_EQ(until("answer").back(), "answer SetProperty");
    EXPECT_EQ(call({"Adapter.SetProperty", "Powered", Var{true}}), "");
}

TEST_F(SimDaemonTest, AdaptersComeAndGoInTheOrderOfTheDaemon) {
    EXPECT_EQ(control({"AddAdapter", Settings{{"Name", "third"}}}), "s:hci2");
    Texts came = taken();
    for (std::size_t i = 0; i < 4; ++i)
        came[i].resize(10); // of the UUIDs, which answers.txt has
    EXPECT_EQ(came, lines("hci0 UUIDs", "hci1 UUIDs", "hci0 UUIDs", "hci1 UUIDs",
                          "/ AdapterAdded o:hci2", "/ Adapters=a(o:hci0 o:hci1 o:hci2)",
                          "hci2 Powered=b:1", "hci2 Pairable=b:1", "hci2 Class=u:7209216",
                          "hci2 Name=s:third", "hci2 Pairable=b:1", "hci2 Discoverable=b:0"));
    registerAgent();
    control({"RemoveAdapter", "hci0"}); // what came last is the default
    EXPECT_EQ(taken(),
              lines("hci0 Pairable=b:0", "hci0 Powered=b:0", "/ Adapters=a(o:hci1 o:hci2)",
                    "/ DefaultAdapterChanged o:hci2", "/ AdapterRemoved o:hci0", "agent Release"));
    control({"RemoveAdapter", "hci1"});
    control({"RemoveAdapter", "hci2"});
    EXPECT_EQ(taken().back(), "/ AdapterRemoved o:hci2");
    EXPECT_EQ(call("Manager.DefaultAdapter"), noAdapter);
    EXPECT_EQ(call("Manager.ListAdapters"), "a()");
}

TEST_F(SimDaemonTest, ARestartChangesAllPathsAndKeepsStoredDevices) {
    create();
    registerAgent();
    taken();
    control("Restart");
    const Texts came = taken();
    EXPECT_EQ(came[0], "agent Release");
    EXPECT_EQ(came[1], "/ AdapterAdded o:hci0");
    EXPECT_NE(findBase(), base);
    EXPECT_EQ(call("Adapter.ListDevices", base + "hci0").rfind(noObject, 0), 0U);
    EXPECT_EQ(call("Adapter.ListDevices"), "a(o:device)");
}

TEST_F(SimDaemonTest, ADroppedNameTakesCallsUnderWayWithItAndComesBack) {
    simulation.delayNext("org.bluez.Adapter", "ListDevices", 60000);
    start("Adapter.ListDevices");
    control("DropName");
    EXPECT_EQ(until("answer"),
              lines("answer ListDevices error org.freedesktop.DBus.Error.NoReply: Message "
                    "recipient disconnected from message bus without replying"));
    EXPECT_EQ(call("Manager.ListAdapters"),
              "error org.freedesktop.DBus.Error.ServiceUnknown: The name org.bluez was not "
              "provided by any .service files");
    control("RegainName");
    EXPECT_EQ(findBase(), base);
}

TEST_F(SimDaemonTest, SigtermReleasesTheAgentsAndASecondDaemonIsRefused) {
    ChildProcess second({BLUEZ4_SIM}, ChildProcess::Output::Capture);
    EXPECT_EQ(second.wait(), 1);
    EXPECT_EQ(second.readAll(), "");
    EXPECT_EQ(second.readErrors(),
              "bluez4-sim: com.kestrine.bluetooth.Sim is already owned on this bus; stop its owner "
              "first; or give it buses of its own: bluez4-sim -- COMMAND\n");
    registerAgent();
    taken();
    simulation.process().signal(SIGTERM);
    EXPECT_EQ(simulation.process().wait(), 0);
    EXPECT_EQ(until("agent"), lines("agent Release"));
    call("org.freedesktop.DBus.GetId");
    EXPECT_EQ(taken(), Texts{});
}

TEST_F(SimDaemonTest, SessionsPowerTheAdapterWithTheAgentsConsent) {
    EXPECT_EQ(call("Adapter.RequestSession"), "error AgentNotAvailable: Agent Not Available");
    registerAgent();
    EXPECT_EQ(call("Adapter.RequestSession"), ""); // it is on
    EXPECT_EQ(call("Adapter.ReleaseSession"), "");
    set("Powered", false);
    peer().replyError("ConfirmModeChange", "org.bluez.Error.Rejected", "said no");
    EXPECT_EQ(call("Adapter.RequestSession"), "error Rejected: said no");
    peer().reply("ConfirmModeChange");
    EXPECT_EQ(trace("Adapter.RequestSession").front(), "agent ConfirmModeChange s:connectable");
    EXPECT_EQ(trace("Adapter.ReleaseSession", "hci0 Powered=b:0"),
              lines("answer ReleaseSession", "hci0 Pairable=b:0", "hci0 Powered=b:0"));
    EXPECT_EQ(call("Adapter.ReleaseSession"), "error Failed: Invalid Session");
}

TEST_F(SimDaemonTest, OneAgentForEachAdapterUntilItsOwnerUnregistersItOrLeaves) {
    auto other = std::make_unique<SimClient>();
    const auto registers = [&](SimClient& by, const char* capability) {
        return by.call({"Adapter.RegisterAgent", agent, capability});
    };
    EXPECT_EQ(registers(*other, "Telepathy"), badArguments);
    EXPECT_EQ(registers(*other, "KeyboardDisplay"), "");
    EXPECT_EQ(registers(*this, ""), "error AlreadyExists: Already Exists");
    EXPECT_EQ(call({"Adapter.UnregisterAgent", agent}), "error DoesNotExist: Does Not Exist");
    leave(other);
    EXPECT_EQ(registers(*this, "KeyboardOnly"), "");
    EXPECT_EQ(trace({"Adapter.UnregisterAgent", agent}),
              lines("agent Release", "answer UnregisterAgent"));
}

} // namespace Bluetooth::Test
