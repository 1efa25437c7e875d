// SPDX-License-Identifier: LGPL-2.1-or-later
#include "host/process_lookup.h"
#include "support/child_process.h"
#include "support/namespace_test.h"

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

std::string inProc(int pid, const char* file) {
    return "/proc/" + std::to_string(pid) + "/" + file;
}

/// Installs the stand-in and starts it as its own child, which is in the background on return.
/// @return the first daemon found
int startDaemon(const char* place = daemonProgram) {
    std::filesystem::copy_file(STANDIN_DAEMON, place, std::filesystem::copy_options::skip_existing);
    ChildProcess starter({place});
    EXPECT_EQ(starter.wait(), 0);
    return getPidFromName("bluetoothd");
}

} // namespace

class ProcessLookupTest : public NamespaceTest {
protected:
    void SetUp() override {
        ASSERT_EQ(getPidFromName("bluetoothd"), -1) << "the build folder's path may not contain it";
    }
    void TearDown() override {
        for (int pid; (pid = getPidFromName("bluetoothd")) > 0;) {
            kill(pid, SIGKILL);
            // Gone when its executable is: it is not a child of this process.
            EXPECT_TRUE(becomesTrue([&] { return !std::filesystem::exists(inProc(pid, "exe")); }));
        }
        std::filesystem::remove(daemonProgram);
    }
};

TEST_F(ProcessLookupTest, MatchesAnyPartOfTheExecutablesPath) {
    const int pid = startDaemon("/tmp/bluetoothd-tool");
    ASSERT_GT(pid, 0);
    EXPECT_EQ(std::filesystem::read_symlink(inProc(pid, "exe")), "/tmp/bluetoothd-tool");
    EXPECT_EQ(getPidFromName("/tmp/blue"), pid);
    EXPECT_EQ(getPidFromName("toothd-tools"), -1);
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(ProcessLookupTest, FirstIsTheFirstAsTextNotAsNumber) {
    const auto lastPid = [] {
        ChildProcess child({"true"});
        return child.pid();
    };
    // Numbers of a new namespace begin at 1: one with two digits is near.
    while (lastPid() < 90) {
    }
    ASSERT_LT(lastPid(), 97) << "run this test alone: the numbers below 100 are used up";
    ASSERT_LT(startDaemon(), 100);
    while (lastPid() < 100) {
    }
    EXPECT_GE(startDaemon(), 100);
}

using RestartTest = ProcessLookupTest;

TEST_F(RestartTest, WithoutAnAdapterTheRunningDaemonIsLeftAlone) {
    const int running = startDaemon();
    EXPECT_EQ(restartBluetoothd(), -1);
    EXPECT_EQ(log.take(), Texts{"commandlib.cpp No dongle. Stop restarting bluetoothd..."});
    EXPECT_EQ(getPidFromName("bluetoothd"), running);
}

TEST_F(RestartTest, KillsTheRunningDaemonAndStartsANewOneThatInheritsNothing) {
    writeFile(marker, "");
    const int old = startDaemon();
    const int pidFile = createPidFile("/tmp/test.pid", 0, true);
    EXPECT_EQ(restartBluetoothd(), 0);
    const int now = getPidFromName("bluetoothd");
    EXPECT_GT(now, 0);
    EXPECT_NE(now, old);
    EXPECT_EQ(log.take(), Texts());

    EXPECT_EQ(countOpenDescriptors(inProc(now, "fd")), 3) << "no PID lock, no socket";
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "no zombie is left";
    EXPECT_EQ(errno, ECHILD);
    close(pidFile);
}

TEST_F(RestartTest, ADaemonThatDoesNotStartIsAFailureWhateverItReturns) {
    writeFile(marker, "");
    EXPECT_EQ(restartBluetoothd(), -1) << "there is no such program";
    writeProgram(daemonProgram, "exit 0");
    EXPECT_EQ(restartBluetoothd(), -1) << "it ends with success and leaves no process";
    EXPECT_EQ(log.take(), Texts(2, "commandlib.cpp Failed to start bluetoothd"));
}

TEST(AddressFromPathTest, TakesAllThatFollowsTheDevice) {
    const std::pair<const char*, const char*> cases[] = {
        {"/org/bluez/1234/hci0/dev_00_11_22_33_44_55", "00:11:22:33:44:55"},
        {"/hci0/dev_00_11_22_33_44_55/service_1", "00:11:22:33:44:55/service:1"},
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
