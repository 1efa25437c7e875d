// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/process.h"

#include "serving/bus/glib_ptr.h"

#include <glib-unix.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <stdexcept>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Bluetooth::Serving {

namespace {

/// All that comes from a pipe up to the first newline or its end; closes it.
std::string readLine(int fd) {
    std::string line;
    char c = 0;
    for (;;) {
        const ssize_t count = read(fd, &c, 1);
        if (count < 0 && errno == EINTR)
            continue;
        if (count <= 0 || c == '\n')
            break;
        line += c;
    }
    close(fd);
    return line;
}

} // namespace

std::vector<char*> cStrings(const std::vector<std::string>& strings) {
    std::vector<char*> pointers;
    pointers.reserve(strings.size() + 1);
    for (const std::string& string : strings)
        pointers.push_back(
            const_cast<char*>(string.c_str())); // exec's signature, not its behaviour
    pointers.push_back(nullptr);
    return pointers;
}

std::vector<std::string> environmentWith(const std::vector<std::string>& changes) {
    std::vector<std::string> result;
    const auto nameOf = [](const std::string& entry) { return entry.substr(0, entry.find('=')); };
    for (char** entry = environ; *entry; ++entry) {
        const bool replaced =
            std::any_of(changes.begin(), changes.end(),
                        [&](const std::string& c) { return nameOf(c) == nameOf(*entry); });
        if (!replaced)
            result.emplace_back(*entry);
    }
    for (const std::string& change : changes)
        if (change.find('=') != std::string::npos)
            result.push_back(change);
    return result;
}

std::string ownProgram() {
    ErrorOut error;
    const GlibPtr<char> path(g_file_read_link("/proc/self/exe", error.out()));
    if (!path)
        throw std::runtime_error(error->message);
    return path.get();
}

void tellReady(int fd, const char* program) {
    constexpr char line[] = "ready\n";
    if (write(fd, line, sizeof line - 1) < 0)
        g_printerr("%s: cannot tell that the daemon is ready: %s\n", program, g_strerror(errno));
}

void endProcess(pid_t pid) {
    constexpr int patience = 200; // of 10 ms
    kill(pid, SIGTERM);
    for (int waited = 0; waited < patience; ++waited) {
        const pid_t ended = waitpid(pid, nullptr, WNOHANG);
        if (ended == pid || (ended < 0 && errno == ECHILD))
            return;
        g_usleep(10000);
    }
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
}

HelperProcess::HelperProcess(const std::vector<std::string>& arguments,
                             const std::vector<std::string>& environment, int lineFd) {
    int fds[2];
    if (!g_unix_open_pipe(fds, FD_CLOEXEC, nullptr))
        throw std::runtime_error(g_strerror(errno));
    const auto argv = cStrings(arguments);
    const auto variables = cStrings(environment);
    const auto apart = [](gpointer) {
        setpgid(0, 0);
        prctl(PR_SET_PDEATHSIG, SIGTERM);
    };
    const int standardOutput = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 0);
    ErrorOut error;
    const gboolean started = g_spawn_async_with_pipes_and_fds(
        nullptr, argv.data(), variables.data(),
        static_cast<GSpawnFlags>(G_SPAWN_DO_NOT_REAP_CHILD | G_SPAWN_SEARCH_PATH), apart, nullptr,
        -1, standardOutput, -1, &fds[1], &lineFd, 1, &m_pid, nullptr, nullptr, nullptr,
        error.out());
    close(fds[1]);
    close(standardOutput);
    if (!started) {
        close(fds[0]);
        throw std::runtime_error("cannot start " + arguments.front() + ": " + error->message);
    }
    m_line = readLine(fds[0]);
}

} // namespace Bluetooth::Serving
