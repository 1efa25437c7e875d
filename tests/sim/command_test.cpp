#include "support/child_process.h"
#include "support/private_bus.h"

#include <gtest/gtest.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

namespace Bluetooth::Test {

namespace {

namespace fs = std::filesystem;

/// `bluez4-sim` with a command, in a folder for temporary files of its own.
class CommandTest : public testing::Test {
protected:
    CommandTest() { fs::create_directories(folder); }
    ~CommandTest() override { fs::remove_all(folder); }

    std::unique_ptr<ChildProcess> start(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), BLUEZ4_SIM);
        return std::make_unique<ChildProcess>(arguments, ChildProcess::Output::Capture,
                                              std::vector<std::string>{"TMPDIR=" + folder});
    }
    int run(const std::vector<std::string>& arguments) {
        const auto process = start(arguments);
        output = process->readAll();
        errors = process->readErrors();
        return process->wait();
    }
    int runShell(const std::string& script, std::vector<std::string> options = {}) {
        for (const std::string& part :
             {std::string("--"), std::string("sh"), std::string("-c"), script})
            options.push_back(part);
        return run(options);
    }
    bool leftNothing() const { return fs::is_empty(folder); }

    const std::string folder = testFolder() + "/tmp";
    std::string output;
    std::string errors;
};

TEST_F(CommandTest, TheCommandFindsTheDaemonAndItsStatusIsOurs) {
    EXPECT_EQ(
        runShell("gdbus call --system -d org.bluez -o / -m org.bluez.Manager.FindAdapter any; "
                 "gdbus call --session -d org.freedesktop.DBus -o / "
                 "-m org.freedesktop.DBus.NameHasOwner org.bluez; "
                 "test -z \"$DBUS_STARTER_ADDRESS\" && exit 7"),
        7);
    EXPECT_EQ(errors, "");
    EXPECT_EQ(output.substr(0, 23), "(objectpath '/org/bluez");
    EXPECT_NE(output.find("(false,)"), std::string::npos) << output;
    EXPECT_TRUE(leftNothing());
}

TEST_F(CommandTest, SignalsAndMissingCommandsHaveTheShellsStatus) {
    EXPECT_EQ(runShell("kill -KILL $$"), 128 + SIGKILL);
    EXPECT_EQ(run({"--", "no-such-command-here"}), 127);
    EXPECT_EQ(errors.substr(0, 12), "bluez4-sim: ");
    EXPECT_EQ(run({"--", "/etc/passwd"}), 126);
    EXPECT_TRUE(leftNothing());
}

TEST_F(CommandTest, ASignalEndsTheCommandAndEverythingGoes) {
    const auto process =
        start({"--", "sh", "-c", "trap 'exit 9' TERM; echo $$; while :; do sleep 0.05; done"});
    const pid_t command = std::stoi(process->readLine());
    process->signal(SIGTERM);
    EXPECT_EQ(process->wait(), 9);
    EXPECT_NE(kill(command, 0), 0);
    EXPECT_TRUE(leftNothing());
}

TEST_F(CommandTest, WhatTheCommandLeavesRunningEndsWithTheSession) {
    EXPECT_EQ(runShell("sleep 1000 >/dev/null 2>&1 & echo $!"), 0);
    EXPECT_NE(kill(std::stoi(output), 0), 0);
}

TEST_F(CommandTest, TheDaemonCanBeAbsentOrKilledWhileTheBusesStay) {
    const std::string hasOwner = "gdbus call --system -d org.freedesktop.DBus -o / "
                                 "-m org.freedesktop.DBus.NameHasOwner org.bluez";
    EXPECT_EQ(runShell(hasOwner, {"--no-daemon"}), 0);
    EXPECT_EQ(output, "(false,)\n");
    EXPECT_EQ(
        runShell("pid=$(gdbus call --system -d org.freedesktop.DBus -o / -m "
                 "org.freedesktop.DBus.GetConnectionUnixProcessID org.bluez | tr -dc '0-9 ' | "
                 "cut -d' ' -f2); kill -KILL $pid; while " +
                 hasOwner + " | grep -q true; do :; done; " + hasOwner),
        0);
    EXPECT_EQ(output, "(false,)\n");
}

TEST_F(CommandTest, SessionServicesAreActivatedWithBothBuses) {
    const std::string services = testFolder() + "/services";
    fs::create_directories(services);
    const std::string seen = services + "/seen";
    std::ofstream(services + "/run.sh") << "env > " << seen << "; exit 1\n";
    std::ofstream(services + "/com.example.Service.service")
        << "[D-BUS Service]\nName=com.example.Service\nExec=/bin/sh " << services << "/run.sh\n";
    runShell("gdbus call --session -d com.example.Service -o / -m a.b.C >/dev/null 2>&1; "
             "echo $DBUS_SYSTEM_BUS_ADDRESS; echo $DBUS_SESSION_BUS_ADDRESS",
             {"--session-services", services});
    std::ifstream file(seen);
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
    EXPECT_EQ(runShell("gdbus call --system -d org.bluez -o / -m org.bluez.Manager.ListAdapters",
                       {"--scenario", file}),
              0);
    EXPECT_NE(output.find("hci1"), std::string::npos);
    EXPECT_EQ(run({"--version"}), 0);
    EXPECT_EQ(run({"--help"}), 0);
}

TEST_F(CommandTest, WrongScenariosAndUsageGiveOneLine) {
    const std::string file = testFolder() + "/wrong.conf";
    const auto scenario = [&](const std::string& text) {
        std::ofstream(file) << text;
        EXPECT_EQ(run({"--scenario", file, "--", "true"}), 1);
        EXPECT_EQ(errors.find('\n'), errors.size() - 1) << errors;
        return errors.substr(0, errors.find('\n'));
    };
    const std::string beginning = "bluez4-sim: " + file + ": ";
    const std::string device = "[Device 00:11:22:33:44:55]\n";
    EXPECT_EQ(scenario(device + "Colour=red\n"),
              beginning + "[Device 00:11:22:33:44:55] Colour: there is no such key");
    EXPECT_EQ(scenario(device + "RSSI=loud\n"),
              beginning + "[Device 00:11:22:33:44:55] RSSI: \"loud\" is not a number from -32768 "
                          "to 32767");
    EXPECT_EQ(scenario(device + "Adapter=hci7\n"),
              beginning + "[Device 00:11:22:33:44:55] Adapter: there is no adapter \"hci7\"");
    EXPECT_EQ(scenario("[Adapter hci0]\nName=x\n"),
              beginning + "[Adapter hci0] Address: is missing");
    EXPECT_EQ(scenario("[Adapter zero]\n"),
              beginning + "[Adapter zero]: an adapter is named hci0 to hci99");
    EXPECT_EQ(scenario("[Radio]\n"),
              beginning + "[Radio]: is neither [Times], [Adapter hciN] nor [Device ADDRESS]");
    EXPECT_EQ(scenario("[Times]\nTea=4\n"), beginning + "[Times] Tea: there is no such time");
    EXPECT_EQ(run({"--scenario", "/no/such/file"}), 1);
    EXPECT_EQ(run({"--time-scale", "-1"}), 2);
    EXPECT_EQ(run({"--nonsense"}), 2);
    EXPECT_EQ(run({"--no-daemon"}), 2);
}

} // namespace

} // namespace Bluetooth::Test
