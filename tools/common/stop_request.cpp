// SPDX-License-Identifier: LGPL-2.1-or-later
#include "common/stop_request.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <time.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <initializer_list>

namespace Tools {

namespace {

constexpr itimerspec timeToStop{{0, 0}, {1, 500'000'000}};

static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler sets it");
std::atomic<bool> stopWanted{false};
int eventDescriptor = -1;
timer_t deadline{};
char childrenFile[64]; // named before a signal comes

void requestStop(int /*signal*/) {
    if (stopWanted.exchange(true))
        return;
    const int error = errno; // a signal handler leaves it alone
    timer_settime(deadline, 0, &timeToStop, nullptr);
    const std::uint64_t one = 1;
    [[maybe_unused]] const ssize_t written = write(eventDescriptor, &one, sizeof(one));
    errno = error;
}

/// Ends the programs that the main thread has started: they would stay. Signal handlers may do so.
void endChildren() {
    const int list = open(childrenFile, O_RDONLY | O_CLOEXEC);
    char text[1024] = {}; // more than it ever starts
    const ssize_t length = list < 0 ? 0 : read(list, text, sizeof text);
    pid_t child = 0;
    for (ssize_t at = 0; at < length; ++at) {
        if (text[at] >= '0' && text[at] <= '9') {
            child = child * 10 + (text[at] - '0');
        } else if (child > 0) { // each number is followed by a blank
            kill(child, SIGKILL);
            child = 0;
        }
    }
}

void endAtOnce(int /*signal*/) {
    endChildren();
    _exit(EXIT_SUCCESS);
}

void handle(int signal, void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;
    sigemptyset(&action.sa_mask);
    action.sa_flags = 0; // no SA_RESTART: what blocks is to be interrupted
    sigaction(signal, &action, nullptr);
}

} // namespace

bool stopOnSignals() {
    eventDescriptor = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    sigevent alarm{};
    alarm.sigev_notify = SIGEV_SIGNAL;
    alarm.sigev_signo = SIGALRM;
    if (eventDescriptor < 0 || timer_create(CLOCK_MONOTONIC, &alarm, &deadline) != 0)
        return false;
    const int process = getpid();
    static_cast<void>(
        snprintf(childrenFile, sizeof childrenFile, "/proc/%d/task/%d/children", process, process));
    handle(SIGALRM, endAtOnce);
    handle(SIGTERM, requestStop);
    handle(SIGINT, requestStop);
    // Whoever started the program may have blocked them.
    sigset_t used;
    sigemptyset(&used);
    for (const int signal : {SIGALRM, SIGTERM, SIGINT})
        sigaddset(&used, signal);
    pthread_sigmask(SIG_UNBLOCK, &used, nullptr);
    return true;
}

int stopDescriptor() {
    return eventDescriptor;
}

bool stopRequested() {
    return stopWanted;
}

} // namespace Tools
