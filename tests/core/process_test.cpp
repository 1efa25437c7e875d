// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/process.h"

#include "support/private_bus.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/ptrace.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>

namespace Bluetooth::Test {

namespace {

constexpr Milliseconds limit(10'000);

std::string outputOf(const char* program, const Texts& arguments) {
    const auto reader = ProcessReader::open(program, arguments, limit);
    std::string output(1000, '\0');
    output.resize(reader ? fread(output.data(), 1, output.size(), reader->stream()) : 0);
    return output;
}

int statusOf(const std::string& script) {
    return runProcess("/bin/sh", {"-c", script});
}

} // namespace

class ProcessTest : public ::testing::Test {
protected:
    void TearDown() override {
        EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "no process is left";
        EXPECT_EQ(errno, ECHILD);
    }
};

TEST_F(ProcessTest, ArgumentsReachTheProgramAsTheyAreWithoutAShell) {
    EXPECT_EQ(outputOf("/usr/bin/printf", {"<%s>", "a b", "$HOME", "", "`id`"}),
              "<a b><$HOME><><`id`>");
}

TEST_F(ProcessTest, AProgramThatCannotBeStartedIsSeen) {
    for (const auto& [program, error] :
         {std::pair("/nowhere/hciconfig", ENOENT), std::pair("/etc/passwd", EACCES),
          std::pair("/", EACCES), std::pair(static_cast<const char*>(nullptr), EINVAL)}) {
        errno = 0;
        EXPECT_EQ(ProcessReader::open(program, {"-a"}, limit), nullptr);
        EXPECT_EQ(errno, error) << program;
        errno = 0;
        EXPECT_EQ(runProcess(program, {}), -1);
        EXPECT_EQ(errno, error) << program;
    }
}

TEST_F(ProcessTest, TheStatusIsTheProgramsOwnDespiteInterruptions) {
    // From now on system calls are interrupted all the time.
    struct sigaction interrupting {};
    interrupting.sa_handler = [](int) {};
    sigaction(SIGALRM, &interrupting, nullptr);
    const itimerval often{{0, 1000}, {0, 1000}};
    const itimerval never{};
    setitimer(ITIMER_REAL, &often, nullptr);
    EXPECT_EQ(statusOf("sleep 0.1; exit 7"), W_EXITCODE(7, 0));
    EXPECT_EQ(statusOf("kill -9 $$"), W_EXITCODE(0, SIGKILL));
    setitimer(ITIMER_REAL, &never, nullptr);
}

TEST_F(ProcessTest, AProgramThatCannotBeClearedAwayHoldsNobodyAndIsLater) {
    auto reader = ProcessReader::open("/bin/sh", {"-c", "echo $$; exec sleep 1000"}, limit);
    int program = 0;
    ASSERT_EQ(fscanf(reader->stream(), "%d", &program), 1);
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const pid_t debugger = fork(); // what is debugged does not go before the debugger has seen it
    if (debugger == 0) {
        const bool isHeld = ptrace(PTRACE_SEIZE, program, nullptr, nullptr) == 0;
        EXPECT_EQ(write(ends[1], isHeld ? "y" : "n", 1), 1);
        for (;;)
            pause();
    }
    char isHeld = 0;
    EXPECT_EQ(read(ends[0], &isHeld, 1), 1);
    reader.reset();
    EXPECT_EQ(kill(program, 0) == 0, isHeld == 'y');
    kill(debugger, SIGKILL);
    EXPECT_EQ(waitpid(debugger, nullptr, 0), debugger);
    EXPECT_EQ(statusOf("exit 0"), 0);
    EXPECT_EQ(kill(program, 0), -1);
    close(ends[0]);
    close(ends[1]);
    if (isHeld != 'y')
        GTEST_SKIP() << "the system permits no debugger";
}

TEST_F(ProcessTest, TheProgramInheritsOutputsOnlyAndNoSignalSettings) {
    const int leaky = open("/dev/null", O_RDWR); // no close-on-exec, as other libraries do
    ASSERT_GE(leaky, 3);
    sigset_t blocked;
    sigset_t before;
    sigemptyset(&blocked);
    sigaddset(&blocked, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &blocked, &before);
    const auto pipeHandler = signal(SIGPIPE, SIG_IGN);

    // 3 is the folder that ls reads.
    EXPECT_EQ(outputOf("/bin/ls", {"/proc/self/fd"}), "0\n1\n2\n3\n");
    EXPECT_EQ(outputOf("/bin/cat", {}), "");
    EXPECT_EQ(statusOf("kill -TERM $$"), W_EXITCODE(0, SIGTERM));
    EXPECT_EQ(statusOf("kill -PIPE $$"), W_EXITCODE(0, SIGPIPE));

    EXPECT_EQ(signal(SIGPIPE, pipeHandler), SIG_IGN);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
    close(leaky);
}

TEST_F(ProcessTest, WorksForAProcessThatHasClosedItsStandardDescriptors) {
    const auto withoutDescriptors = [] {
        close(STDIN_FILENO);
        close(STDOUT_FILENO);
        _exit(outputOf("/usr/bin/printf", {"fine"}) == "fine" ? 7 : 1);
    };
    EXPECT_EXIT(withoutDescriptors(), ::testing::ExitedWithCode(7), "");
}

TEST_F(ProcessTest, WaitsForTheStartedProgramOnlyNotForWhatItLeavesBehind) {
    const std::string file = testFolder() + "/background";
    EXPECT_EQ(statusOf("sleep 1000 & echo $! > " + file), 0);
    int pid = 0;
    std::ifstream(file) >> pid;
    ASSERT_GT(pid, 1);
    EXPECT_EQ(kill(pid, SIGKILL), 0);
}

} // namespace Bluetooth::Test
