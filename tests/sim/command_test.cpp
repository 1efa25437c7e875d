// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/child_process.h"
#include "support/private_bus.h"
#include "support/raw_peer.h"

#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <string>

namespace Bluetooth::Test {

namespace fs = std::filesystem;

const std::string gdbus = "gdbus call --system -o / -d ";
const std::string hasOwner = gdbus + "org.freedesktop.DBus -m org.freedesktop.DBus.NameHasOwner "
                                     "org.bluez";

/// `bluez4-sim` with a command, in a folder for temporary files of its own.
class CommandTest : public testing::Test {
protected:
    CommandTest() { fs::create_directories(folder); }
    /// Whatever happened, nothing is left there.
    ~CommandTest() override { EXPECT_TRUE(fs::is_empty(folder)); }

    std::unique_ptr<ChildProcess> start(Texts arguments) const {
        arguments.insert(arguments.begin(), BLUEZ4_SIM);
        return std::make_unique<ChildProcess>(arguments, ChildProcess::Output::Capture,
                                              Texts{"TMPDIR=" + folder});
    }
    Result run(const Texts& arguments) const { return start(arguments)->finish(); }
    Result runShell(const std::string& script, Texts options = {}) const {
        options.insert(options.end(), {"--", "sh", "-c", script});
        return run(options);
    }

    const std::string folder = testFolder() + "/tmp";
};

TEST_F(CommandTest, TheCommandFindsTheDaemonAndItsStatusIsOurs) {
    const Result found = runShell(gdbus + "org.bluez -m org.bluez.Manager.FindAdapter any; " +
                                  "gdbus call --session -d org.freedesktop.DBus -o / "
                                  "-m org.freedesktop.DBus.NameHasOwner org.bluez; "
                                  "test -z \"$DBUS_STARTER_ADDRESS\" && exit 7");
    EXPECT_EQ(found.status, 7);
    EXPECT_EQ(found.err, "");
    EXPECT_EQ(found.out.rfind("(objectpath '/org/bluez", 0), 0U) << found;
    EXPECT_NE(found.out.find("(false,)"), std::string::npos) << found;

    EXPECT_EQ(runShell("kill -KILL $$").status, 128 + SIGKILL);
    EXPECT_EQ(run({"--", "/etc/passwd"}).status, 126);
    const Result missing = run({"--", "no-such-command-here"});
    EXPECT_EQ(missing.status, 127);
    EXPECT_EQ(missing.err.rfind("bluez4-sim: ", 0), 0U) << missing;
}

TEST_F(CommandTest, ASignalEndsTheCommandAndWhatItLeavesRunningEndsWithTheSession) {
    const auto process =
        start({"--", "sh", "-c", "trap 'exit 9' TERM; echo $$; while :; do sleep 0.05; done"});
    const pid_t command = std::stoi(process->readLine());
    process->signal(SIGTERM);
    EXPECT_EQ(process->wait(), 9);
    EXPECT_NE(kill(command, 0), 0);
    EXPECT_NE(kill(std::stoi(runShell("sleep 1000 >/dev/null 2>&1 & echo $!").out), 0), 0);
}

TEST_F(CommandTest, TheBusesLetManyCallsWaitForTheirAnswers) {
    const auto process =
        start({"--no-daemon", "--", "sh", "-c",
               "echo $DBUS_SYSTEM_BUS_ADDRESS; echo $DBUS_SESSION_BUS_ADDRESS; exec sleep 1000"});
    for (int bus = 0; bus < 2; ++bus) {
        const std::string address = process->readLine();
        RawPeer silent(address, "com.example.Silent");
        silent.neverReply("Wait");
        RawPeer caller(address);
        for (int i = 0; i < 300; ++i)
            caller.call("com.example.Silent", "/", "com.example.Silent", "Wait");
        EXPECT_TRUE(silent.waitForCalls("Wait", 300));
    }
    process->signal(SIGTERM);
    process->wait();
}

TEST_F(CommandTest, TheDaemonCanBeAbsentOrKilledWhileTheBusesStay) {
    const Result absent{0, "(false,)\n", ""};
    EXPECT_EQ(runShell(hasOwner, {"--no-daemon"}), absent);
    EXPECT_EQ(runShell("pid=$(" + gdbus +
                       "org.freedesktop.DBus -m org.freedesktop.DBus.GetConnectionUnixProcessID "
                       "org.bluez | tr -dc '0-9 ' | cut -d' ' -f2); kill -KILL $pid; while " +
                       hasOwner + " | grep -q true; do :; done; " + hasOwner),
              absent);
}

TEST_F(CommandTest, SessionServicesAreActivatedWithBothBuses) {
    const std::string services = testFolder() + "/services";
    fs::create_directories(services);
    std::ofstream(services + "/com.example.Service.service")
        << "[D-BUS Service]\nName=com.example.Service\n"
        << "Exec=/bin/sh -c \"env > " << services << "/seen; exit 1\"\n";
    EXPECT_EQ(runShell("gdbus call --session -d com.example.Service -o / -m a.b.C 2>/dev/null; "
                       "for kind in SYSTEM SESSION; do "
                       "grep -qFx \"$(env | grep \"^DBUS_${kind}_BUS_ADDRESS=\")\" " +
                           services + "/seen || echo \"no $kind bus\"; done",
                       {"--session-services", services}),
              (Result{0, "", ""}));
}

TEST_F(CommandTest, TheBuiltInScenarioCanBePrintedAndUsed) {
    const std::string file = testFolder() + "/mine.conf";
    std::ofstream(file) << run({"--list-scenario"}).out;
    const Result adapters =
        runShell(gdbus + "org.bluez -m org.bluez.Manager.ListAdapters", {"--scenario", file});
    EXPECT_NE(adapters.out.find("hci1"), std::string::npos) << adapters;
    EXPECT_EQ(run({"--version"}).status, 0);
    EXPECT_EQ(run({"--help"}).status, 0);
}

TEST_F(CommandTest, WrongScenariosAndUsageGiveOneLine) {
    const std::string file = testFolder() + "/wrong.conf";
    const std::string device = "[Device 00:11:22:33:44:55]";
    const std::pair<std::string, std::string> scenarios[] = {
        {device + "\nColour=red\n", device + " Colour: there is no such key"},
        {device + "\nRSSI=loud\n", device + " RSSI: \"loud\" is not a number from -32768 to 32767"},
        {device + "\nAdapter=hci7\n", device + " Adapter: there is no adapter \"hci7\""},
        {"[Adapter hci0]\nName=x\n", "[Adapter hci0] Address: is missing"},
        {"[Adapter zero]\n", "[Adapter zero]: an adapter is named hci0 to hci99"},
        {"[Radio]\n", "[Radio]: is neither [Times], [Audio], [Adapter hciN] nor [Device ADDRESS]"},
        {"[Times]\nTea=4\n", "[Times] Tea: there is no such time"}};
    for (const auto& [text, line] : scenarios) {
        std::ofstream(file) << text;
        EXPECT_EQ(run({"--scenario", file, "--", "true"}),
                  (Result{1, "", "bluez4-sim: " + file + ": " + line + "\n"}));
    }
    EXPECT_EQ(run({"--scenario", "/no/such/file"}).status, 1);
    for (const Texts& usage : {Texts{"--time-scale", "-1"}, {"--nonsense"}, {"--no-daemon"}})
        EXPECT_EQ(run(usage).status, 2);
}

} // namespace Bluetooth::Test
