#include "host/namespace_test.h"

#include <bluetooth/commandlib.h>

#include <signal.h>
#include <sys/wait.h>

#include <cerrno>

namespace Bluetooth::Test {

namespace {

constexpr const char* path = "/tmp/test.pid";
constexpr int closeOnExec = 1;

/// Another process that holds a PID file until this object ends.
class OtherDaemon {
public:
    explicit OtherDaemon(const char* file) {
        int ready[2];
        EXPECT_EQ(pipe(ready), 0);
        m_pid = fork();
        if (m_pid == 0) {
            const char answer = createPidFile(file, 0, true) >= 0 ? '1' : '0';
            static_cast<void>(write(ready[1], &answer, 1) == 1);
            for (;;)
                pause();
        }
        char answer = '0';
        EXPECT_EQ(read(ready[0], &answer, 1), 1);
        EXPECT_EQ(answer, '1');
        close(ready[0]);
        close(ready[1]);
    }
    ~OtherDaemon() {
        kill(m_pid, SIGKILL);
        waitpid(m_pid, nullptr, 0);
    }
    OtherDaemon(const OtherDaemon&) = delete;
    OtherDaemon& operator=(const OtherDaemon&) = delete;

    pid_t pid() const { return m_pid; }

private:
    pid_t m_pid;
};

std::string line(const char* message) {
    return std::string("auto_connect.cpp ") + message;
}

} // namespace

class PidFileTest : public NamespaceTest {};

TEST_F(PidFileTest, HoldsTheProcessIdAndNothingElse) {
    writeFile(path, "a longer text than any process id\n");
    const int descriptor = createPidFile(path, closeOnExec | 6, true);
    ASSERT_GE(descriptor, 0);
    EXPECT_EQ(readFile(path), std::to_string(getpid()) + "\n");
    EXPECT_EQ(fcntl(descriptor, F_GETFD), FD_CLOEXEC);

    const int second = createPidFile(path, 6, true);
    EXPECT_GE(second, 0) << "the lock is the process's, so its own second call succeeds";
    EXPECT_EQ(fcntl(second, F_GETFD), 0) << "only bit 0 means something";
    EXPECT_EQ(readFile(path), std::to_string(getpid()) + "\n");
    close(second);
    close(descriptor);
    EXPECT_EQ(log.take(), Texts());

    std::filesystem::remove(path);
    const mode_t mask = umask(0);
    close(createPidFile(path, 0, true));
    umask(mask);
    struct stat status {};
    ASSERT_EQ(stat(path, &status), 0);
    EXPECT_EQ(status.st_mode, static_cast<mode_t>(S_IFREG | 0600)) << "for its owner only";
}

TEST_F(PidFileTest, AnotherProcessKeepsItsLockAndItsNumber) {
    {
        const OtherDaemon other(path);
        EXPECT_EQ(createPidFile(path, 0, false), -1);
        EXPECT_EQ(errno, EAGAIN);
        EXPECT_EQ(log.take(), Texts());
        EXPECT_EQ(createPidFile(path, closeOnExec, true), -1);
        EXPECT_EQ(log.take(),
                  Texts{line("PID file '/tmp/test.pid' is locked; Daemon is already running")});
        EXPECT_EQ(readFile(path), std::to_string(other.pid()) + "\n");
    }
    const int descriptor = createPidFile(path, 0, true);
    EXPECT_GE(descriptor, 0) << "the lock ends with the process";
    close(descriptor);
}

TEST_F(PidFileTest, EachFailureHasItsOwnLineAndLeavesNothingOpen) {
    const int before = dup(0);
    close(before);
    const std::pair<const char*, std::string> cases[] = {
        {nullptr, "Could not open PID file (null)"},
        {"/tmp", "Could not open PID file /tmp"},
        {"/nowhere/x.pid", "Could not open PID file /nowhere/x.pid"},
        {"/dev/null", "Could not truncate PID file '/dev/null'"},
        {"/small/x.pid", "Writing to PID file '/small/x.pid'"},
    };
    writeFile("/small/x.pid", "");
    writeFile("/small/filler", std::string(100000, 'x'));
    for (const auto& [path, message] : cases) {
        EXPECT_EQ(createPidFile(path, closeOnExec, true), -1);
        EXPECT_EQ(log.take(), Texts{line(message.c_str())});
    }
    std::filesystem::remove("/small/filler");
    const int after = dup(0);
    EXPECT_EQ(after, before);
    close(after);
}

} // namespace Bluetooth::Test
