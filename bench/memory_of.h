// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BENCH_MEMORY_OF_H
#define KESBLUETOOTH_BENCH_MEMORY_OF_H

#include <sys/types.h>

#include <fstream>
#include <string>

namespace Bench {

/// What a file of /proc/PID tells of a process's memory, in bytes: "VmRSS:" (now) and "VmHWM:" (at
/// most) of "status", "Pss:" (with its share of what it shares) of "smaps_rollup".
inline double memoryOf(pid_t pid, const char* file, const char* kind) {
    std::ifstream status("/proc/" + std::to_string(pid) + "/" + file);
    std::string word;
    double kibibytes = 0;
    while (status >> word && word != kind) {
    }
    status >> kibibytes;
    return kibibytes * 1024;
}

} // namespace Bench

#endif
