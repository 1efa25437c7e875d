// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/namespace_test.h"

#include <bluetooth/commandlib.h>

#include <cerrno>

namespace Bluetooth::Test {

namespace {

constexpr const char* path = "/tmp/test.pid";
constexpr int closeOnExec = 1;

} // namespace

class PidFileTest : public NamespaceTest {
protected:
    const std::string ownNumber = std::to_string(getpid()) + "\n";
};

TEST_F(PidFileTest, HoldsTheProcessIdAndNothingElse) {
    const mode_t mask = umask(0);
    close(createPidFile(path, 0, true));
    umask(mask);
    struct stat status {};
    ASSERT_EQ(stat(path, &status), 0);
    EXPECT_EQ(status.st_mode, static_cast<mode_t>(S_IFREG | 0600)) << "for its owner only";

    writeFile(path, "a longer text than any process id\n");
    const int descriptor = createPidFile(path, closeOnExec | 6, true);
    EXPECT_EQ(fcntl(descriptor, F_GETFD), FD_CLOEXEC);
    EXPECT_EQ(readFile(path), ownNumber);
    const int second = createPidFile(path, 6, true); // only bit 0 means something
    EXPECT_EQ(fcntl(second, F_GETFD), 0) << "the lock is the process's, so its own call succeeds";
    EXPECT_EQ(readFile(path), ownNumber);
    close(second);
    close(descriptor);
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(PidFileTest, AnotherProcessIsRefusedAndTheNumberStays) {
    const int descriptor = createPidFile(path, 0, true);
    const auto otherProcess = [this] {
        errno = 0;
        const bool refused =
            createPidFile(path, 0, false) == -1 && errno == EAGAIN && log.take().empty() &&
            createPidFile(path, closeOnExec, true) == -1 &&
            log.take() == Texts{inAutoConnect(
                              "PID file '/tmp/test.pid' is locked; Daemon is already running")};
        _exit(refused ? 7 : 0);
    };
    EXPECT_EXIT(otherProcess(), ::testing::ExitedWithCode(7), "");
    EXPECT_EQ(readFile(path), ownNumber);
    close(descriptor);
    EXPECT_EXIT(otherProcess(), ::testing::ExitedWithCode(0), "") << "the lock ends with its file";
}

TEST_F(PidFileTest, EachFailureHasItsOwnLineAndLeavesNothingOpen) {
    const auto before = countOpenDescriptors();
    const std::pair<const char*, const char*> cases[] = {
        {nullptr, "Could not open PID file (null)"},
        {"/tmp", "Could not open PID file /tmp"},
        {"/nowhere/x.pid", "Could not open PID file /nowhere/x.pid"},
        {path, "Could not open PID file /tmp/test.pid"}, // a link
        {"/tmp/hard.pid", "Could not open PID file /tmp/hard.pid"},
        {"/dev/null", "Could not truncate PID file '/dev/null'"},
        {"/small/x.pid", "Writing to PID file '/small/x.pid'"},
    };
    writeFile("/small/x.pid", "");
    writeFile("/tmp/precious", "kept");
    std::filesystem::create_symlink("/tmp/precious", path);
    std::filesystem::create_hard_link("/tmp/precious", "/tmp/hard.pid");
    writeFile("/small/filler", std::string(100000, 'x'));
    for (const auto& [file, message] : cases) {
        EXPECT_EQ(createPidFile(file, closeOnExec, true), -1);
        EXPECT_EQ(log.take(), Texts{inAutoConnect(message)});
    }
    std::filesystem::remove("/small/filler");
    EXPECT_EQ(countOpenDescriptors(), before);
    EXPECT_EQ(readFile("/tmp/precious"), "kept");
}

} // namespace Bluetooth::Test
