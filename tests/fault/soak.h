// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_FAULT_SOAK_H
#define KESBLUETOOTH_TESTS_FAULT_SOAK_H

#include "support/latch.h"

#include <gtest/gtest.h>

#include <malloc.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <iterator>

namespace Bluetooth::Test {

/// How much of a full soak is to be done: KESBLUETOOTH_SOAK percent, or so much that the tests stay
/// quick, which is 1 percent or what is given.
inline int soakCount(int full, int quick = 0) {
    const char* percent = std::getenv("KESBLUETOOTH_SOAK");
    const auto share = percent ? static_cast<int>(std::strtol(percent, nullptr, 10)) : 1;
    return std::max({full / 100 * share, quick, 1}) / (isSanitized ? 5 : 1) + 1;
}

/// What the process holds.
struct Holdings {
    long descriptors = std::distance(std::filesystem::directory_iterator("/proc/self/fd"),
                                     std::filesystem::directory_iterator());
    long bytes = static_cast<long>(mallinfo2().uordblks + mallinfo2().hblkhd);
};

/// How much the queues between threads once held stays with libdbus, and is not growth. A sanitizer
/// keeps what was freed for a while.
inline void expectNoGrowth(const Holdings& before) {
    const Holdings now;
    std::cout << "descriptors " << before.descriptors << " -> " << now.descriptors << ", heap "
              << before.bytes / 1024 << " -> " << now.bytes / 1024 << " KiB\n";
    EXPECT_EQ(now.descriptors, before.descriptors);
    if (!isSanitized) {
        EXPECT_LT(now.bytes - before.bytes, 256 * 1024);
    }
}

} // namespace Bluetooth::Test

#endif
