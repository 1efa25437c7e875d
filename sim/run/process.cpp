#include "run/process.h"

#include <glib-unix.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <stdexcept>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Bluetooth::Sim {

std::vector<char*> cStrings(const std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (const std::string& text : texts)
        pointers.push_back(const_cast<char*>(text.c_str())); // exec's signature, not its behaviour
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

pid_t startHelper(const Helper& helper, int& output) {
    int fds[2];
    if (!g_unix_open_pipe(fds, FD_CLOEXEC, nullptr))
        throw std::runtime_error(g_strerror(errno));
    const auto arguments = cStrings(helper.arguments);
    const auto environment = cStrings(helper.environment);
    const auto apart = [](gpointer) {
        setpgid(0, 0);
        prctl(PR_SET_PDEATHSIG, SIGTERM);
    };
    const int standardOutput = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 0);
    GPid pid = 0;
    ErrorOut error;
    const gboolean started = g_spawn_async_with_pipes_and_fds(
        nullptr, arguments.data(), environment.data(),
        static_cast<GSpawnFlags>(G_SPAWN_DO_NOT_REAP_CHILD | G_SPAWN_SEARCH_PATH), apart, nullptr,
        -1, standardOutput, -1, &fds[1], &helper.pipeTarget, 1, &pid, nullptr, nullptr, nullptr,
        error.out());
    close(fds[1]);
    close(standardOutput);
    if (!started) {
        close(fds[0]);
        throw std::runtime_error("cannot start " + helper.arguments.front() + ": " +
                                 error->message);
    }
    output = fds[0];
    return pid;
}

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

} // namespace Bluetooth::Sim
