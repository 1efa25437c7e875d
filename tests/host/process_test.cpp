#include "core/process.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <fstream>

namespace Bluetooth::Test {

namespace {

std::string outputOf(const char* program, const std::vector<std::string>& arguments) {
    const auto reader = ProcessReader::open(program, arguments);
    if (!reader)
        return "cannot be started";
    std::string output;
    for (int byte = fgetc(reader->stream()); byte != EOF; byte = fgetc(reader->stream()))
        output += static_cast<char>(byte);
    return output;
}

bool hasNoChild() {
    return waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD;
}

/// A set of signals in the text of /proc/PID/status, without those that the C library keeps to
/// itself (32 and 33).
unsigned long signals(const std::string& status, const char* name) {
    const std::size_t place = status.find(name);
    return place == std::string::npos
               ? ~0ul
               : std::stoul(status.substr(place + strlen(name)), nullptr, 16) & ~(3ul << 31);
}

} // namespace

TEST(ProcessTest, ArgumentsReachTheProgramAsTheyAreWithoutAShell) {
    EXPECT_EQ(outputOf("/usr/bin/printf", {"<%s>", "a b", "$HOME", "", "`id`"}),
              "<a b><$HOME><><`id`>");
    EXPECT_TRUE(hasNoChild());
}

TEST(ProcessTest, AProgramThatCannotBeStartedIsSeen) {
    for (const auto& [program, error] :
         {std::pair("/nowhere/hciconfig", ENOENT), std::pair("/etc/passwd", EACCES),
          std::pair("/", EACCES), std::pair(static_cast<const char*>(nullptr), EINVAL)}) {
        errno = 0;
        EXPECT_EQ(ProcessReader::open(program, {"-a"}), nullptr);
        EXPECT_EQ(errno, error) << program;
        errno = 0;
        EXPECT_EQ(runProcess(program, {}), -1);
        EXPECT_EQ(errno, error) << program;
    }
    EXPECT_TRUE(hasNoChild());
}

TEST(ProcessTest, TheStatusIsTheProgramsOwnDespiteInterruptions) {
    // From now on system calls are interrupted all the time.
    struct sigaction interrupting {};
    struct sigaction before {};
    interrupting.sa_handler = [](int) {};
    sigaction(SIGALRM, &interrupting, &before);
    const itimerval often{{0, 1000}, {0, 1000}};
    const itimerval never{};
    setitimer(ITIMER_REAL, &often, nullptr);
    const int exited = runProcess("/bin/sh", {"-c", "sleep 0.1; exit 7"});
    EXPECT_TRUE(WIFEXITED(exited) && WEXITSTATUS(exited) == 7) << exited;
    const int killed = runProcess("/bin/sh", {"-c", "kill -9 $$"});
    EXPECT_TRUE(WIFSIGNALED(killed) && WTERMSIG(killed) == SIGKILL) << killed;
    setitimer(ITIMER_REAL, &never, nullptr);
    sigaction(SIGALRM, &before, nullptr);
    EXPECT_TRUE(hasNoChild());
}

TEST(ProcessTest, ClosingEarlyEndsAProgramThatGoesOnWriting) {
    {
        const auto reader = ProcessReader::open("/usr/bin/yes", {});
        ASSERT_NE(reader, nullptr);
        EXPECT_EQ(fgetc(reader->stream()), 'y');
    }
    EXPECT_TRUE(hasNoChild());
}

TEST(ProcessTest, TheProgramInheritsOutputsOnlyAndNoSignalSettings) {
    const int leaky = open("/dev/null", O_RDWR); // no close-on-exec, as other libraries do
    ASSERT_GE(leaky, 3);
    sigset_t blocked;
    sigemptyset(&blocked);
    sigaddset(&blocked, SIGTERM);
    sigset_t before;
    pthread_sigmask(SIG_BLOCK, &blocked, &before);
    const auto pipeHandler = signal(SIGPIPE, SIG_IGN);

    // 3 is the folder that ls reads.
    EXPECT_EQ(outputOf("/bin/ls", {"/proc/self/fd"}), "0\n1\n2\n3\n");
    const std::string status = outputOf("/bin/cat", {"/proc/self/status"});
    EXPECT_EQ(signals(status, "SigBlk:"), 0u);
    EXPECT_EQ(signals(status, "SigIgn:"), 0u);
    EXPECT_EQ(outputOf("/bin/cat", {}), "");

    EXPECT_EQ(signal(SIGPIPE, pipeHandler), SIG_IGN);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
    close(leaky);
}

TEST(ProcessTest, WorksForAProcessThatHasClosedItsStandardDescriptors) {
    ::testing::FLAGS_gtest_death_test_style = "threadsafe";
    EXPECT_EXIT(
        {
            close(STDIN_FILENO);
            close(STDOUT_FILENO);
            _exit(outputOf("/usr/bin/printf", {"fine"}) == "fine" ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), "");
}

TEST(ProcessTest, WaitsForTheStartedProgramOnlyNotForWhatItLeavesBehind) {
    const int status = runProcess("/bin/sh", {"-c", "sleep 1000 & echo $! > /tmp/background.pid"});
    EXPECT_EQ(status, 0);
    int pid = 0;
    std::ifstream("/tmp/background.pid") >> pid;
    ASSERT_GT(pid, 1);
    EXPECT_EQ(kill(pid, SIGKILL), 0);
}

} // namespace Bluetooth::Test
