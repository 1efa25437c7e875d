#include "host/namespace_test.h"
#include "host/process_lookup.h"
#include "support/child_process.h"

#include <bluetooth/commandlib.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

namespace Bluetooth::Test {

namespace {

constexpr const char* daemonProgram = "/usr/sbin/bluetoothd";
constexpr const char* marker = "/tmp/bluetooth.info_0";

void install(const char* place) {
    std::filesystem::copy_file(STANDIN_DAEMON, place,
                               std::filesystem::copy_options::overwrite_existing);
}

/// Starts the stand-in as its own child, which has put itself into the background on return.
void startDaemon(const char* program) {
    ChildProcess starter({program});
    ASSERT_EQ(starter.wait(), 0);
}

void killAll(const char* name) {
    for (int pid = getPidFromName(name); pid > 0; pid = getPidFromName(name)) {
        kill(pid, SIGKILL);
        // Gone when its executable is: it is not a child of this process.
        while (std::filesystem::exists("/proc/" + std::to_string(pid) + "/exe"))
            usleep(1000);
    }
}

} // namespace

class ProcessLookupTest : public NamespaceTest {
protected:
    void SetUp() override {
        NamespaceTest::SetUp();
        ASSERT_EQ(getPidFromName("bluetoothd"), -1) << "the build folder's path may not contain it";
    }
    void TearDown() override {
        killAll("bluetoothd");
        std::filesystem::remove(daemonProgram);
    }
};

TEST_F(ProcessLookupTest, MatchesAnyPartOfTheExecutablesPath) {
    install("/tmp/bluetoothd-tool");
    ChildProcess starter({"/tmp/bluetoothd-tool"});
    ASSERT_EQ(starter.wait(), 0);
    const int pid = getPidFromName("bluetoothd");
    ASSERT_GT(pid, 0);
    EXPECT_EQ(std::filesystem::read_symlink("/proc/" + std::to_string(pid) + "/exe"),
              "/tmp/bluetoothd-tool");
    EXPECT_EQ(getPidFromName("/tmp/blue"), pid);
    EXPECT_EQ(getPidFromName("toothd-tools"), -1);
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(ProcessLookupTest, FirstIsTheFirstAsTextNotAsNumber) {
    install(daemonProgram);
    const auto lastPid = [] {
        const pid_t child = fork();
        if (child == 0)
            _exit(0);
        waitpid(child, nullptr, 0);
        return child;
    };
    // Numbers of a new namespace begin at 1: one with two digits is near.
    while (lastPid() < 90) {
    }
    ASSERT_LT(lastPid(), 97) << "run this test alone: the numbers below 100 are used up";
    startDaemon(daemonProgram);
    const int twoDigits = getPidFromName("bluetoothd");
    ASSERT_LT(twoDigits, 100);
    while (lastPid() < 100) {
    }
    startDaemon(daemonProgram);
    EXPECT_GE(getPidFromName("bluetoothd"), 100);
}

class RestartTest : public ProcessLookupTest {};

TEST_F(RestartTest, WithoutAnAdapterTheRunningDaemonIsLeftAlone) {
    install(daemonProgram);
    startDaemon(daemonProgram);
    const int running = getPidFromName("bluetoothd");
    EXPECT_EQ(restartBluetoothd(), -1);
    EXPECT_EQ(log.take(), Texts{"commandlib.cpp No dongle. Stop restarting bluetoothd..."});
    EXPECT_EQ(getPidFromName("bluetoothd"), running);
}

TEST_F(RestartTest, KillsTheRunningDaemonAndStartsANewOneThatInheritsNothing) {
    writeFile(marker, "");
    install(daemonProgram);
    startDaemon(daemonProgram);
    const int old = getPidFromName("bluetoothd");
    const int pidFile = createPidFile("/tmp/test.pid", 0, true);
    EXPECT_EQ(restartBluetoothd(), 0);
    const int now = getPidFromName("bluetoothd");
    EXPECT_GT(now, 0);
    EXPECT_NE(now, old);
    EXPECT_EQ(log.take(), Texts());

    const std::filesystem::directory_iterator inherited("/proc/" + std::to_string(now) + "/fd");
    EXPECT_EQ(std::distance(begin(inherited), end(inherited)), 3) << "no PID lock, no socket";
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "no zombie is left";
    EXPECT_EQ(errno, ECHILD);
    close(pidFile);
}

TEST_F(RestartTest, ADaemonThatDoesNotStartIsAFailureWhateverItReturns) {
    writeFile(marker, "");
    EXPECT_EQ(restartBluetoothd(), -1) << "there is no such program";
    writeFile(daemonProgram, "#!/bin/sh\nexit 0\n");
    std::filesystem::permissions(daemonProgram, std::filesystem::perms::all);
    EXPECT_EQ(restartBluetoothd(), -1) << "it ends with success and leaves no process";
    EXPECT_EQ(log.take(), Texts(2, "commandlib.cpp Failed to start bluetoothd"));
}

TEST(AddressFromPathTest, TakesAllThatFollowsTheDevice) {
    const std::pair<const char*, const char*> cases[] = {
        {"/org/bluez/1234/hci0/dev_00_11_22_33_44_55", "00:11:22:33:44:55"},
        {"/dev_AA_BB/service_1", "AA:BB/service:1"},
        {"/dev_1/dev_2", "1/dev:2"},
        {"dev_", ""},
        {"/org/bluez/1234/hci0", nullptr},
        {nullptr, nullptr}};
    for (const auto& [path, address] : cases) {
        char* const found = getAddressFromPath(path);
        EXPECT_STREQ(found, address);
        free(found);
    }
}

} // namespace Bluetooth::Test
