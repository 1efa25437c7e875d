// The verbs that use the machine's fixed paths; ctest runs them in a namespace of their own.

#include "kesbt/kesbt_test.h"

#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

namespace Bluetooth::Test {

namespace {

constexpr const char* adapterAddress = "00:1A:7D:DA:71:10";
constexpr const char* folder = "/etc/bluetooth/autoconnect/";
const std::string file = std::string(folder) + adapterAddress;

class HostVerbs : public HostTest {
protected:
    static std::string content() {
        std::ifstream stream(file, std::ios::binary);
        return std::string(std::istreambuf_iterator<char>(stream), {});
    }
    static void setContent(const std::string& text) {
        std::filesystem::create_directory(folder);
        std::ofstream(file, std::ios::binary) << text;
    }
};

TEST_F(HostVerbs, TheListIsChangedEntryByEntryAndTheFlagStays) {
    EXPECT_EQ(run({"autoconnect", "show", "--json"}).json(),
              (Json{{"adapterAddress", adapterAddress},
                    {"file", file},
                    {"enabled", false},
                    {"devices", Json::array()}}));
    EXPECT_FALSE(std::filesystem::exists(folder)); // looking changes nothing

    EXPECT_EQ(run({"autoconnect", "add", mouse}).status, 0);
    EXPECT_EQ(content(), std::string("0,") + mouse);
    run({"autoconnect", "add", gps});
    run({"autoconnect", "enable"});
    run({"autoconnect", "add", gps});
    EXPECT_EQ(content(), std::string("1,") + mouse + "," + gps);
    run({"autoconnect", "remove", mouse});
    EXPECT_EQ(content(), std::string("1,") + gps);
    run({"autoconnect", "disable"});
    EXPECT_EQ(content(), std::string("0,") + gps);
    failure({"autoconnect", "remove", mouse});

    setContent(std::string("1,") + gps + "\n"); // written with an editor
    run({"autoconnect", "add", headset});
    EXPECT_EQ(content(), std::string("1,") + gps + "," + headset);
    setContent(std::string("1,") + gps + ",");
    run({"autoconnect", "add", mouse});
    EXPECT_EQ(content(), std::string("1,") + gps + "," + mouse);
    EXPECT_EQ(
        run({"--adapter", "00:1a:7d:da:71:10", "autoconnect", "show", "--json"}).json()["devices"],
        (Json{gps, mouse}));
}

TEST_F(HostVerbs, KnownDevicesAndTargetsAreListed) {
    setContent(std::string("1,") + mouse + "," + gps);
    EXPECT_EQ(run({"autoconnect", "targets", "--json"}).json()[0]["address"], mouse);
    setContent(std::string("1,") + mouse + "," + gps);
    EXPECT_EQ(run({"autoconnect", "list", "--json"}).json()[0]["address"], mouse);
    EXPECT_EQ(content(), std::string("1,") + mouse); // what the adapter does not know leaves
}

TEST_F(HostVerbs, AFileThatCannotBeUsedIsAFailureAndStays) {
    std::filesystem::create_directories(file);
    for (const char* verb : {"show", "enable", "disable", "list"})
        EXPECT_EQ(failure({"autoconnect", verb}),
                  "cannot use " + file + ": Is a directory; make the file writable or remove it\n");
    EXPECT_TRUE(std::filesystem::is_directory(file));
}

TEST_F(HostVerbs, CommandsNeedTheAutoConnectDaemon) {
    for (const char* verb : {"reload", "pause", "resume"})
        EXPECT_EQ(failure({"autoconnect", verb}),
                  "no auto-connect daemon takes commands; start it: kesbt-autoconnectd\n");
    ChildProcess reader({"cat", "/tmp/kes_bluetooth_autoconnect"}, // made by the failures
                        ChildProcess::Output::Capture);
    while (run({"autoconnect", "pause"}).status != 0) { // until the reader is there
    }
    EXPECT_EQ(reader.readAll(), "pause");
}

TEST_F(HostVerbs, ARestartedDaemonHasToComeToTheBus) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root may restart bluetoothd";
    const auto install = [](const std::string& program, const std::string& arguments = "") {
        const std::string copy = "/usr/sbin/bluetoothd-program"; // told by its executable's name
        std::filesystem::remove(copy);
        std::filesystem::copy_file(program, copy);
        // It returns once the program runs, as a daemon that puts itself into the background does.
        std::ofstream("/usr/sbin/bluetoothd")
            << "#!/bin/sh\n"
            << copy << arguments << " >/dev/null 2>&1 &\n"
            << "until readlink /proc/$!/exe | grep -q bluetoothd; do :; done\n";
        std::filesystem::permissions("/usr/sbin/bluetoothd", std::filesystem::perms::owner_all);
    };
    std::ofstream("/tmp/bluetooth.info_hci0");
    daemon->kill();
    install("/usr/bin/sleep", " 60");
    EXPECT_EQ(failure({"restart-daemon", "--timeout", "0.2"}),
              "bluetoothd was started and did not come to the system bus within the time-out; try "
              "again or give a longer --timeout\n");
    install(BLUEZ4_SIM);
    EXPECT_EQ(run({"restart-daemon", "--json"}).json(), (Json{{"restarted", true}}));
    EXPECT_EQ(run({"adapters"}).status, 0);
}

TEST_F(HostVerbs, WithoutAdaptersThereIsNothingToRestartOrAsk) {
    const Result name = run({"name", headset, "--timeout", "100"});
    EXPECT_EQ(name.status, 1);
    EXPECT_EQ(name.err.substr(0, 41), "cannot get the name of 00:11:22:33:44:01:");
    const std::string line = failure({"restart-daemon"});
    EXPECT_EQ(line, geteuid() == 0
                        ? "bluetoothd was not restarted: no adapter is plugged in (there is no "
                          "/tmp/bluetooth.info_* file); plug one in\n"
                        : "only root may restart bluetoothd; run it as root\n");
}

} // namespace

} // namespace Bluetooth::Test
