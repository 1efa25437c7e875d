// SPDX-License-Identifier: LGPL-2.1-or-later
#include "wakeup.h"

#include <signal.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdint>

namespace AutoConnectd {

namespace {

static_assert(std::atomic<bool>::is_always_lock_free, "a signal handler sets them");
std::atomic<bool> stopWanted{false};
std::atomic<bool> reloadWanted{false};
int eventDescriptor = -1;

void wake() {
    const int error = errno; // a signal handler leaves it alone
    const std::uint64_t one = 1;
    // It fails only when the counter is at its limit, and then the loop wakes anyway.
    [[maybe_unused]] const ssize_t written = write(eventDescriptor, &one, sizeof(one));
    errno = error;
}

void stopHandler(int /*signal*/) {
    requestStop();
}

} // namespace

bool openWakeup() {
    eventDescriptor = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    return eventDescriptor >= 0;
}

void stopOnSignals() {
    struct sigaction action {};
    action.sa_handler = stopHandler;
    sigemptyset(&action.sa_mask);
    action.sa_flags = 0; // no SA_RESTART: a read that blocks is to be interrupted
    sigaction(SIGTERM, &action, nullptr);
    sigaction(SIGINT, &action, nullptr);
}

int wakeupDescriptor() {
    return eventDescriptor;
}

void requestStop() {
    stopWanted = true;
    wake();
}

void requestReload() {
    reloadWanted = true;
    wake();
}

void requestCheck() {
    wake();
}

bool stopRequested() {
    return stopWanted;
}

bool takeReload() {
    std::uint64_t count = 0;
    [[maybe_unused]] const ssize_t taken = read(eventDescriptor, &count, sizeof(count));
    return reloadWanted.exchange(false);
}

} // namespace AutoConnectd
