// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BENCH_PROCESSOR_TIME_H
#define KESBLUETOOTH_BENCH_PROCESSOR_TIME_H

#include <ctime>
#include <stdexcept>
#include <sys/types.h>

namespace Bench {

/// The processor time, in seconds, that a process has used so far.
inline double processorSeconds(pid_t pid) {
    clockid_t clock = 0;
    timespec time = {};
    if (clock_getcpuclockid(pid, &clock) != 0 || clock_gettime(clock, &time) != 0)
        throw std::runtime_error("a process that is measured has ended");
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

} // namespace Bench

#endif
