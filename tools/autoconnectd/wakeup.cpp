// SPDX-License-Identifier: LGPL-2.1-or-later
#include "wakeup.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>

namespace AutoConnectd {

namespace {
std::atomic<bool> adaptersChanged{false};
std::atomic<bool> powerChanged{false};
int eventDescriptor = -1;
} // namespace

bool openWakeup() {
    eventDescriptor = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    return eventDescriptor >= 0;
}

int wakeupDescriptor() {
    return eventDescriptor;
}

void tellAdapters() {
    adaptersChanged = true;
    tellConnection();
}

void tellPower() {
    powerChanged = true;
    tellAdapters();
}

void tellConnection() {
    const std::uint64_t one = 1;
    // It fails only when the counter is at its limit, and then the loop wakes anyway.
    [[maybe_unused]] const ssize_t written = write(eventDescriptor, &one, sizeof(one));
}

News takeNews() {
    std::uint64_t count = 0;
    [[maybe_unused]] const ssize_t taken = read(eventDescriptor, &count, sizeof(count));
    return {adaptersChanged.exchange(false), powerChanged.exchange(false)};
}

} // namespace AutoConnectd
