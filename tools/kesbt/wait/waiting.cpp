// SPDX-License-Identifier: LGPL-2.1-or-later
#include "wait/waiting.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <limits>
#include <thread>
#include <vector>

namespace Kesbt {

namespace {

/// @return what was blocked or unblocked
sigset_t mask(int how) {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGINT);
    sigaddset(&signals, SIGTERM);
    pthread_sigmask(how, &signals, nullptr);
    return signals;
}

int openSignals() {
    const sigset_t signals = mask(SIG_BLOCK);
    return signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK);
}

/// For poll(): rounded up, so that it does not return just before the deadline.
int millisecondsUntil(Clock::time_point deadline) {
    if (deadline == Clock::time_point::max())
        return -1;
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
    return static_cast<int>(std::clamp<long>(left, 0, std::numeric_limits<int>::max()));
}

} // namespace

FileDescriptor::~FileDescriptor() {
    if (m_fd >= 0)
        close(m_fd);
}

Interrupt::Interrupt() : m_descriptor(openSignals()) {}

Interrupt::~Interrupt() {
    while (take()) { // what has come is dealt with: it must not end the program now
    }
    mask(SIG_UNBLOCK);
}

bool Interrupt::take() {
    signalfd_siginfo signal{};
    return read(fd(), &signal, sizeof signal) == sizeof signal;
}

Wakeup::Wakeup() : m_descriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}

void Wakeup::raise() {
    eventfd_write(fd(), 1);
}

void Wakeup::clear() {
    eventfd_t count = 0;
    eventfd_read(fd(), &count);
}

void waitForInput(std::initializer_list<int> descriptors, Clock::time_point deadline) {
    std::vector<pollfd> fds;
    fds.reserve(descriptors.size());
    for (const int fd : descriptors)
        fds.push_back({fd, POLLIN, 0});
    poll(fds.data(), fds.size(), millisecondsUntil(deadline));
}

bool waitUntil(const std::function<bool()>& isTrue, std::chrono::milliseconds limit) {
    constexpr std::chrono::milliseconds longestPause{200};
    const auto deadline = Clock::now() + limit;
    for (std::chrono::milliseconds pause{2};; pause = std::min(2 * pause, longestPause)) {
        if (isTrue())
            return true;
        const auto now = Clock::now();
        if (now >= deadline)
            return false;
        std::this_thread::sleep_until(std::min(now + pause, deadline));
    }
}

Failure notConfirmed(const std::string& what) {
    return Failure(what + " within the time-out; try again or give a longer --timeout");
}

} // namespace Kesbt
