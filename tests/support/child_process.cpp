// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/child_process.h"

#include <fcntl.h>
#include <poll.h>
#include <pty.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <stdexcept>

namespace Bluetooth::Test {

namespace {

std::vector<char*> pointers(std::vector<std::string>& texts) {
    std::vector<char*> result;
    result.reserve(texts.size() + 1);
    for (std::string& text : texts)
        result.push_back(text.data());
    result.push_back(nullptr);
    return result;
}

std::vector<std::string> fullEnvironment(std::vector<std::string> added) {
    for (char** entry = environ; *entry; ++entry)
        added.emplace_back(*entry); // the first of a name counts
    return added;
}

/// Appends what can be read. @return false at the end or in time-out
bool readMore(int descriptor, std::string& buffer, Milliseconds limit) {
    pollfd input{descriptor, POLLIN, 0};
    char bytes[4096];
    if (poll(&input, 1, static_cast<int>(limit.count())) <= 0)
        return false;
    const ssize_t length = read(descriptor, bytes, sizeof bytes);
    if (length <= 0)
        return false;
    buffer.append(bytes, static_cast<std::size_t>(length));
    return true;
}

/// Takes the first bytes.
std::string cut(std::string& buffer, std::size_t length) {
    std::string text = buffer.substr(0, length);
    buffer.erase(0, length);
    return text;
}

bool openTerminal(int (&ends)[2]) {
    const winsize narrow{24, 40, 0, 0};
    if (openpty(&ends[0], &ends[1], nullptr, nullptr, &narrow) != 0)
        return false;
    termios settings{};
    tcgetattr(ends[1], &settings);
    settings.c_oflag &= ~static_cast<tcflag_t>(ONLCR); // lines end as the program writes them
    tcsetattr(ends[1], TCSANOW, &settings);
    for (const int end : ends)
        fcntl(end, F_SETFD, FD_CLOEXEC);
    return true;
}

} // namespace

ChildProcess::ChildProcess(std::vector<std::string> command, Output output,
                           std::vector<std::string> environment) {
    environment = fullEnvironment(std::move(environment));
    const std::vector<char*> argv = pointers(command);
    const std::vector<char*> envp = pointers(environment);
    int out[2] = {-1, -1};
    int err[2] = {-1, -1};
    const bool isOpen =
        output == Output::Inherit ||
        (pipe2(out, O_CLOEXEC) == 0 &&
         (output == Output::Terminal ? openTerminal(err) : pipe2(err, O_CLOEXEC) == 0));
    if (!isOpen)
        throw std::runtime_error("no pipe for the output of " + command[0]);

    m_pid = fork();
    if (m_pid == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        if (output == Output::Terminal) {
            setsid();
            ioctl(err[1], TIOCSCTTY, 0);
            dup2(err[1], STDIN_FILENO);
        }
        if (output != Output::Inherit) {
            dup2(out[1], STDOUT_FILENO);
            dup2(err[1], STDERR_FILENO);
        }
        execvpe(argv[0], argv.data(), envp.data());
        _exit(127);
    }
    if (output != Output::Inherit) {
        close(out[1]);
        close(err[1]);
        m_output = out[0];
        m_errors = err[0];
    }
    if (m_pid < 0)
        throw std::runtime_error("cannot start " + command[0]);
}

ChildProcess::~ChildProcess() {
    kill();
    for (const int descriptor : {m_output, m_errors}) {
        if (descriptor >= 0)
            close(descriptor);
    }
}

void ChildProcess::signal(int number) const {
    if (m_status < 0)
        ::kill(m_pid, number);
}

void ChildProcess::kill() {
    signal(SIGKILL);
    wait();
}

int ChildProcess::wait(Milliseconds limit) {
    if (m_status >= 0)
        return m_status;
    const auto deadline = std::chrono::steady_clock::now() + limit;
    const auto descriptor = static_cast<int>(syscall(SYS_pidfd_open, m_pid, 0));
    pollfd ended{descriptor, POLLIN, 0};
    int status = 0;
    bool isEnded = waitpid(m_pid, &status, WNOHANG) == m_pid;
    while (!isEnded && std::chrono::steady_clock::now() < deadline) {
        auto left = std::chrono::ceil<Milliseconds>(deadline - std::chrono::steady_clock::now());
        if (descriptor < 0) // valgrind knows no such descriptors
            left = std::min(left, Milliseconds(10));
        poll(&ended, 1, static_cast<int>(left.count()));
        isEnded = waitpid(m_pid, &status, WNOHANG) == m_pid;
    }
    close(descriptor);
    if (isEnded)
        m_status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    return m_status;
}

Result ChildProcess::finish() {
    std::string out = readAll();
    std::string err = readErrors();
    return {wait(), std::move(out), std::move(err)};
}

std::string ChildProcess::readLine(Milliseconds limit) {
    std::size_t end = 0;
    while ((end = m_buffer.find('\n')) == std::string::npos) {
        if (!readMore(m_output, m_buffer, limit))
            return std::exchange(m_buffer, {});
    }
    std::string line = cut(m_buffer, end + 1);
    line.pop_back();
    return line;
}

std::string ChildProcess::readAll(Milliseconds limit) {
    while (readMore(m_output, m_buffer, limit)) {
    }
    return std::exchange(m_buffer, {});
}

std::string ChildProcess::readErrors(Milliseconds limit) {
    while (readMore(m_errors, m_errorBuffer, limit)) {
    }
    return std::exchange(m_errorBuffer, {});
}

std::string ChildProcess::readUntil(const std::string& prompt, Milliseconds limit) {
    while (m_errorBuffer.find(prompt) == std::string::npos) {
        if (!readMore(m_errors, m_errorBuffer, limit))
            throw std::runtime_error("no \"" + prompt + "\" after: " + m_errorBuffer);
    }
    return cut(m_errorBuffer, m_errorBuffer.find(prompt) + prompt.size());
}

void ChildProcess::type(const std::string& keys) const {
    [[maybe_unused]] const ssize_t written = write(m_errors, keys.data(), keys.size());
}

} // namespace Bluetooth::Test
