// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/process.h"

#include "core/descriptor.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <mutex>
#include <optional>

namespace Bluetooth {

namespace {

using Clock = std::chrono::steady_clock;

/// What the new process does to itself before it becomes the program.
class SpawnSetup {
public:
    /// @param output descriptor to become its standard output; -1: this process's own
    explicit SpawnSetup(int output) {
        posix_spawn_file_actions_init(&m_actions);
        posix_spawnattr_init(&m_attributes);

        // Output first: its descriptor may be 0 where this process has closed its own.
        if (output >= 0)
            posix_spawn_file_actions_adddup2(&m_actions, output, STDOUT_FILENO);
        posix_spawn_file_actions_addopen(&m_actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        // Not left to close-on-exec: descriptors that are not the library's own lack it.
        posix_spawn_file_actions_addclosefrom_np(&m_actions, STDERR_FILENO + 1);

        sigset_t none;
        sigemptyset(&none);
        posix_spawnattr_setsigmask(&m_attributes, &none);
        sigset_t all;
        sigfillset(&all);
        posix_spawnattr_setsigdefault(&m_attributes, &all);
        posix_spawnattr_setflags(&m_attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
    }

    SpawnSetup(const SpawnSetup&) = delete;
    SpawnSetup& operator=(const SpawnSetup&) = delete;

    ~SpawnSetup() {
        posix_spawnattr_destroy(&m_attributes);
        posix_spawn_file_actions_destroy(&m_actions);
    }

    const posix_spawn_file_actions_t* actions() const { return &m_actions; }
    const posix_spawnattr_t* attributes() const { return &m_attributes; }

private:
    posix_spawn_file_actions_t m_actions{};
    posix_spawnattr_t m_attributes{};
};

/// Processes, as descriptors, that were killed and are there still: a broken device may hold one in
/// a call that nothing ends. Where there are more, they stay as zombies.
std::mutex keptLock;
std::array<std::optional<int>, 16> kept;

bool isReaped(int process) {
    siginfo_t info{};
    return waitid(P_PIDFD, static_cast<id_t>(process), &info, WEXITED | WNOHANG) != 0 ||
           info.si_pid != 0;
}

/// By descriptors, since the numbers may be other processes' where the program waits for all.
void reapKept() {
    const std::lock_guard guard(keptLock);
    for (std::optional<int>& process : kept) {
        if (process && isReaped(*process)) {
            close(*process);
            process.reset();
        }
    }
}

void keep(int process) {
    const std::lock_guard guard(keptLock);
    const auto place = std::find(kept.begin(), kept.end(), std::nullopt);
    if (place != kept.end())
        *place = process;
    else
        close(process);
}

/// @return 1 when there is something to read, or an end; 0 when the time is over; -1 with errno set
int awaitInput(int descriptor, Clock::time_point end) {
    for (;;) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now());
        if (left.count() <= 0)
            return 0;
        pollfd input{descriptor, POLLIN, 0};
        const int ready = poll(&input, 1, static_cast<int>(left.count()));
        if (ready > 0 || (ready < 0 && errno != EINTR))
            return ready;
    }
}

/// @return the process, or -1 with errno set
pid_t start(const char* program, const std::vector<std::string>& arguments, int output) {
    if (!program) {
        errno = EINVAL;
        return -1;
    }
    std::vector<char*> argv{const_cast<char*>(program)};
    for (const std::string& argument : arguments)
        argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);

    const SpawnSetup setup(output);
    reapKept();
    pid_t pid = -1;
    const int error =
        posix_spawn(&pid, program, setup.actions(), setup.attributes(), argv.data(), environ);
    if (error != 0) {
        errno = error;
        return -1;
    }
    return pid;
}

int waitFor(pid_t pid) {
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR)
            return -1;
    }
    return status;
}

/// Kills a process; one that does not end then is left to a later reapKept().
void endProcess(pid_t pid) {
    constexpr std::chrono::seconds patience{1};
    kill(pid, SIGKILL);
    const int process = static_cast<int>(syscall(SYS_pidfd_open, pid, 0));
    if (process < 0) { // an old system, or one that does not permit it
        waitFor(pid);
        return;
    }
    awaitInput(process, Clock::now() + patience);
    if (isReaped(process))
        close(process);
    else
        keep(process);
}

} // namespace

ProcessReader::ProcessReader(int output, std::chrono::milliseconds limit)
    : m_output(output), m_end(std::chrono::steady_clock::now() + limit) {
    cookie_io_functions_t functions{};
    functions.read = read;
    m_stream = fopencookie(this, "r", functions);
}

ssize_t ProcessReader::read(void* reader, char* buffer, size_t size) {
    auto& self = *static_cast<ProcessReader*>(reader);
    const int ready = awaitInput(self.m_output.number(), self.m_end);
    self.m_isOverdue = ready == 0;
    return ready > 0 ? ::read(self.m_output.number(), buffer, size) : ready;
}

// Each thing gets its owner before the next step, which may run out of memory.
std::unique_ptr<ProcessReader> ProcessReader::open(const char* program,
                                                   const std::vector<std::string>& arguments,
                                                   std::chrono::milliseconds limit) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        return nullptr;
    const Descriptor output(ends[1]);
    Descriptor input(ends[0]);
    // The memory is there when the descriptor is released: arguments come after it.
    std::unique_ptr<ProcessReader> reader(new ProcessReader(input.release(), limit));
    if (reader->m_stream)
        reader->m_pid = start(program, arguments, output.number());
    const int error = errno;
    if (reader->m_pid < 0)
        reader.reset();
    errno = error;
    return reader;
}

ProcessReader::~ProcessReader() {
    if (m_stream)
        static_cast<void>(fclose(m_stream)); // only read from
    if (m_pid < 0 || waitpid(m_pid, nullptr, WNOHANG) != 0)
        return; // nothing to end
    endProcess(m_pid);
}

int runProcess(const char* program, const std::vector<std::string>& arguments) {
    const pid_t pid = start(program, arguments, -1);
    return pid < 0 ? -1 : waitFor(pid);
}

} // namespace Bluetooth
