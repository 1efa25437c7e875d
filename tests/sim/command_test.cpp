#include "support/child_process.h"
#include "support/private_bus.h"

#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <string>

namespace Bluetooth::Test {

namespace {

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
    int run(const Texts& arguments) {
        const auto process = start(arguments);
        output = process->readAll();
        errors = process->readErrors();
        return process->wait();
    }
    int runShell(const std::string& script, Texts options = {}) {
        options.insert(options.end(), {"--", "sh", "-c", script});
        return run(options);
    }

    const std::string folder = testFolder() + "/tmp";
    std::string output;
    std::string errors;
};

TEST_F(CommandTest, TheCommandFindsTheDaemonAndItsStatusIsOurs) {
    EXPECT_EQ(runShell(gdbus + "org.bluez -m org.bluez.Manager.FindAdapter any; " +
                       "gdbus call --session -d org.freedesktop.DBus -o / "
                       "-m org.freedesktop.DBus.NameHasOwner org.bluez; "
                       "test -z \"$DBUS_STARTER_ADDRESS\" && exit 7"),
              7);
    EXPECT_EQ(errors, "");
    EXPECT_EQ(output.find("(objectpath '/org/bluez"), 0U) << output;
    EXPECT_NE(output.find("(false,)"), std::string::npos) << output;

    EXPECT_EQ(runShell("kill -KILL $$"), 128 + SIGKILL);
    EXPECT_EQ(run({"--", "no-such-command-here"}), 127);
    EXPECT_EQ(errors.find("bluez4-sim: "), 0U) << errors;
    EXPECT_EQ(run({"--", "/etc/passwd"}), 126);
}

TEST_F(CommandTest, ASignalEndsTheCommandAndWhatItLeavesRunningEndsWithTheSession) {
    const auto process =
        start({"--", "sh", "-c", "trap 'exit 9' TERM; echo $$; while :; do sleep 0.05; done"});
    const pid_t command = std::stoi(process->readLine());
    process->signal(SIGTERM);
    EXPECT_EQ(process->wait(), 9);
    EXPECT_NE(kill(command, 0), 0);
    EXPECT_EQ(runShell("sleep 1000 >/dev/null 2>&1 & echo $!"), 0);
    EXPECT_NE(kill(std::stoi(output), 0), 0);
}

TEST_F(CommandTest, TheDaemonCanBeAbsentOrKilledWhileTheBusesStay) {
    EXPECT_EQ(runShell(hasOwner, {"--no-daemon"}), 0);
    EXPECT_EQ(output, "(false,)\n");
    EXPECT_EQ(runShell("pid=$(" + gdbus +
                       "org.freedesktop.DBus -m org.freedesktop.DBus.GetConnectionUnixProcessID "
                       "org.bluez | tr -dc '0-9 ' | cut -d' ' -f2); kill -KILL $pid; while " +
                       hasOwner + " | grep -q true; do :; done; " + hasOwner),
              0);
    EXPECT_EQ(output, "(false,)\n");
}

TEST_F(CommandTest, SessionServicesAreActivatedWithBothBuses) {
    const std::string services = testFolder() + "/services";
    fs::create_directories(services);
    const std::string seenFile = services + "/seen";
    std::ofstream(services + "/run.sh") << "env > " << seenFile << "; exit 1\n";
    std::ofstream(services + "/com.example.Service.service")
        << "[D-BUS Service]\nName=com.example.Service\nExec=/bin/sh " << services << "/run.sh\n";
    runShell("gdbus call --session -d com.example.Service -o / -m a.b.C >/dev/null 2>&1; "
             "echo $DBUS_SYSTEM_BUS_ADDRESS; echo $DBUS_SESSION_BUS_ADDRESS",
             {"--session-services", services});
    std::ifstream file(seenFile);
    const std::string environment((std::istreambuf_iterator<char>(file)), {});
    std::istringstream addresses(output);
    for (std::string address; std::getline(addresses, address);)
        EXPECT_NE(environment.find(address), std::string::npos) << address;
    EXPECT_NE(environment.find("DBUS_SYSTEM_BUS_ADDRESS="), std::string::npos);
}

TEST_F(CommandTest, TheBuiltInScenarioCanBePrintedAndUsed) {
    EXPECT_EQ(run({"--list-scenario"}), 0);
    const std::string file = testFolder() + "/mine.conf";
    std::ofstream(file) << output;
    EXPECT_EQ(runShell(gdbus + "org.bluez -m org.bluez.Manager.ListAdapters", {"--scenario", file}),
              0);
    EXPECT_NE(output.find("hci1"), std::string::npos);
    EXPECT_EQ(run({"--version"}), 0);
    EXPECT_EQ(run({"--help"}), 0);
}

TEST_F(CommandTest, WrongScenariosAndUsageGiveOneLine) {
    const std::string file = testFolder() + "/wrong.conf";
    const std::string beginning = "bluez4-sim: " + file + ": ";
    const std::string device = "[Device 00:11:22:33:44:55]";
    const std::pair<std::string, std::string> scenarios[] = {
        {device + "\nColour=red\n", device + " Colour: there is no such key"},
        {device + "\nRSSI=loud\n", device + " RSSI: \"loud\" is not a number from -32768 to 32767"},
        {device + "\nAdapter=hci7\n", device + " Adapter: there is no adapter \"hci7\""},
        {"[Adapter hci0]\nName=x\n", "[Adapter hci0] Address: is missing"},
        {"[Adapter zero]\n", "[Adapter zero]: an adapter is named hci0 to hci99"},
        {"[Radio]\n", "[Radio]: is neither [Times], [Adapter hciN] nor [Device ADDRESS]"},
        {"[Times]\nTea=4\n", "[Times] Tea: there is no such time"}};
    for (const auto& [text, line] : scenarios) {
        std::ofstream(file) << text;
        EXPECT_EQ(run({"--scenario", file, "--", "true"}), 1);
        EXPECT_EQ(errors.find('\n'), errors.size() - 1);
        EXPECT_EQ(errors.substr(0, errors.size() - 1), beginning + line);
    }
    EXPECT_EQ(run({"--scenario", "/no/such/file"}), 1);
    for (const Texts& usage : {Texts{"--time-scale", "-1"}, {"--nonsense"}, {"--no-daemon"}})
        EXPECT_EQ(run(usage), 2);
}

} // namespace

} // namespace Bluetooth::Test
