// SPDX-License-Identifier: LGPL-2.1-or-later
// The verbs that use the machine's fixed paths; ctest runs them in a namespace of their own.

#include "kesbt/kesbt_test.h"

#include <sys/socket.h>
#include <unistd.h>

#include <filesystem>

namespace Bluetooth::Test {

const std::string adapterAddress = "00:1A:7D:DA:71:10";
const std::string file = configFolder + adapterAddress;
const std::string mouse = knownMouse;
const std::string receiver = pinReceiver;

class HostVerbs : public HostTest {
protected:
    static void setContent(const std::string& text) {
        std::filesystem::create_directory(configFolder);
        writeFile(file, text);
    }
};

TEST_F(HostVerbs, TheListIsChangedEntryByEntryAndTheFlagStays) {
    EXPECT_EQ(json("autoconnect show"), (Json{{"adapterAddress", adapterAddress},
                                              {"file", file},
                                              {"enabled", false},
                                              {"devices", Json::array()}}));
    EXPECT_FALSE(std::filesystem::exists(configFolder)); // looking changes nothing

    setContent("");
    EXPECT_EQ(run("autoconnect add "s + mouse).err, "");
    EXPECT_EQ(readFile(file), "0," + mouse);
    const Result unknown = run("autoconnect add "s + receiver);
    EXPECT_EQ(unknown.status, 0);
    EXPECT_EQ(unknown.err, adapterAddress + " does not know " + receiver +
                               ", which leaves an enabled list when that is read; pair it\n");
    run("autoconnect enable");
    run("autoconnect add "s + receiver);
    EXPECT_EQ(readFile(file), "1," + mouse + "," + receiver);
    run("autoconnect remove "s + mouse);
    EXPECT_EQ(readFile(file), "1," + receiver);
    run("autoconnect disable");
    EXPECT_EQ(readFile(file), "0," + receiver);
    failure("autoconnect remove "s + mouse);

    setContent("1," + receiver + "\n"); // written with an editor
    run("autoconnect add "s + headset);
    EXPECT_EQ(readFile(file), "1," + receiver + "\n," + headset) << "it is part of the entry";
    EXPECT_NE(run("autoconnect show").out.find(receiver + "\\n"), std::string::npos);
    run("autoconnect remove "s + receiver);
    EXPECT_EQ(readFile(file), "1,"s + headset);
    setContent("1," + receiver + ",");
    run("autoconnect add "s + mouse);
    EXPECT_EQ(readFile(file), "1," + receiver + "," + mouse);
    EXPECT_EQ(json("--adapter 00:1a:7d:da:71:10 autoconnect show")["devices"],
              (Json{receiver, mouse}));
}

TEST_F(HostVerbs, KnownDevicesAndTargetsAreListedAndOthersNamed) {
    for (const char* verb : {"autoconnect targets --json", "autoconnect list --json"}) {
        setContent("1," + mouse + "," + receiver);
        const Result result = run(verb);
        EXPECT_EQ(Json::parse(result.out)[0]["address"], mouse);
        EXPECT_EQ(readFile(file), "1," + mouse);
        EXPECT_EQ(result.err, adapterAddress + " does not know \"" + receiver +
                                  "\", which has left its list; pair it and add it again\n");
    }
}

TEST_F(HostVerbs, AFileThatCannotBeUsedIsAFailureAndStays) {
    std::filesystem::create_directories(file);
    for (const char* verb : {"show", "enable", "disable", "list", "targets"})
        EXPECT_EQ(failure("autoconnect "s + verb),
                  "cannot use " + file + ": Is a directory; make the file writable or remove it\n");
    EXPECT_TRUE(std::filesystem::is_directory(file));

    if (isSanitized)
        return; // the thread sanitizer holds the time-out's signal back while flock() waits
    std::filesystem::remove(file);
    setContent("0"); // and another program that changes it hangs
    const int lock = open((configFolder + ".lock"s).c_str(), O_RDWR | O_CREAT, 0600);
    ASSERT_EQ(flock(lock, LOCK_EX), 0);
    EXPECT_EQ(failure("autoconnect enable --timeout 0.2"),
              "no answer within the time-out; try again or give a longer --timeout\n");
    EXPECT_EQ(readFile(file), "0");
    close(lock);
}

TEST_F(HostVerbs, CommandsNeedTheAutoConnectDaemonAndItsPipe) {
    const auto expectNoDaemon = [this](const char* verb) {
        EXPECT_EQ(failure("autoconnect "s + verb),
                  "no auto-connect daemon takes commands; start it: kesbt-autoconnectd\n");
    };
    expectNoDaemon("reload");
    EXPECT_FALSE(std::filesystem::exists(commandPipe)) << "any user could read it";
    {
        const PipeReader daemon(commandPipe);
        std::filesystem::permissions(commandPipe, std::filesystem::perms(0644));
        expectNoDaemon("pause");
        std::filesystem::permissions(commandPipe, std::filesystem::perms(0600));
    }
    const int reader = open(commandPipe, O_RDONLY | O_NONBLOCK);
    expectNoDaemon("resume"); // it holds no lock
    close(reader);
    const PipeReader daemon(commandPipe);
    EXPECT_EQ(run("autoconnect pause").status, 0);
    EXPECT_EQ(daemon.take(), "pause");
    if (geteuid() == 0) {
        EXPECT_EQ(
            runShell("exec setpriv --reuid 1234 --clear-groups " KESBT " autoconnect pause"),
            (Result{1, "", "no permission to command the auto-connect daemon; run it as root\n"}));
    }

    std::filesystem::remove(commandPipe);
    std::filesystem::create_symlink("/dev/full", commandPipe);
    EXPECT_EQ(failure("autoconnect reload"),
              "/tmp/kes_bluetooth_autoconnect is not the auto-connect daemon's pipe; remove it and "
              "start the auto-connect daemon again: kesbt-autoconnectd\n");
}

TEST_F(HostVerbs, ARestartedDaemonHasToComeToTheBus) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root may restart bluetoothd";
    const auto install = [](const std::string& program, const std::string& arguments = "") {
        const std::string copy = "/usr/sbin/bluetoothd-program"; // told by its executable's name
        std::filesystem::remove(copy);
        std::filesystem::copy_file(program, copy);
        // It returns once the program runs, as a daemon that puts itself into the background does.
        writeProgram("/usr/sbin/bluetoothd",
                     copy + arguments + " >/dev/null 2>&1 &\n" +
                         "until readlink /proc/$!/exe | grep -q bluetoothd; do :; done\n");
    };
    writeFile("/tmp/bluetooth.info_hci0", "");
    simulation.process().kill();
    install("/usr/bin/sleep", " 60");
    EXPECT_EQ(failure("restart-daemon --timeout 0.2"),
              "bluetoothd was started and did not come to the system bus within the time-out; try "
              "again or give a longer --timeout\n");
    install(BLUEZ4_SIM);
    EXPECT_EQ(json("restart-daemon"), (Json{{"restarted", true}}));
    EXPECT_EQ(run("adapters").status, 0);
}

TEST_F(HostVerbs, WithoutAdaptersThereIsNothingToRestartOrAsk) {
    const Result name = run("name "s + headset + " --timeout 0.1");
    EXPECT_EQ(name.status, 1);
    const int hci = socket(AF_BLUETOOTH, SOCK_RAW, 1);
    const bool hasHci = hci >= 0 || errno != EAFNOSUPPORT;
    close(hci);
    EXPECT_EQ(name.err.substr(0, hasHci ? 41 : std::string::npos),
              "cannot get the name of 00:11:22:33:44:01:"s +
                  (hasHci
                       ? ""
                       : " this kernel has no Bluetooth; load it as root (modprobe bluetooth), or "
                         "ask bluetoothd: kesbt device 00:11:22:33:44:01\n"));
    const std::string line = failure("restart-daemon");
    EXPECT_EQ(line, geteuid() == 0
                        ? "bluetoothd was not restarted: no adapter is plugged in (there is no "
                          "/tmp/bluetooth.info_* file); plug one in\n"
                        : "only root may restart bluetoothd; run it as root\n");
}

} // namespace Bluetooth::Test
