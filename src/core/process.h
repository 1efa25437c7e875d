// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_PROCESS_H
#define KESBLUETOOTH_CORE_PROCESS_H

#include "core/descriptor.h"

#include <sys/types.h>

#include <chrono>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth {

/// Programs are started by their full path, without a shell. They inherit standard output and
/// error and nothing else: standard input is empty, every other descriptor is closed, no signal
/// is blocked or ignored.

/// A running program whose standard output can be read.
class ProcessReader {
public:
    /// Starts a program.
    /// @param program   its path; also its first argument
    /// @param arguments the arguments after that
    /// @param limit     how long it may take to write what is read
    /// @return null with errno set when it cannot be started (missing, not executable)
    static std::unique_ptr<ProcessReader> open(const char* program,
                                               const std::vector<std::string>& arguments,
                                               std::chrono::milliseconds limit);

    ProcessReader(const ProcessReader&) = delete;
    ProcessReader& operator=(const ProcessReader&) = delete;

    /// Closes the stream, and ends the program where it still runs: nobody reads it any more. Waits
    /// for its end for at most 1 s; after that a later start of a program clears it away.
    ~ProcessReader();

    /// What the program writes within its time. Closed by the destructor.
    FILE* stream() const { return m_stream; }
    /// Whether the stream is at its end because the time is over.
    bool isOverdue() const { return m_isOverdue; }

private:
    ProcessReader(int output, std::chrono::milliseconds limit);

    /// read() for the stream.
    static ssize_t read(void* reader, char* buffer, size_t size);

    const Descriptor m_output;
    const std::chrono::steady_clock::time_point m_end;
    bool m_isOverdue = false;
    FILE* m_stream = nullptr;
    pid_t m_pid = -1;
};

/// Runs a program and waits for it to end; processes that it leaves in the background are not
/// waited for.
/// @return its status as waitpid() gives it; -1 with errno set when it cannot be started, or when
///         its status is lost because this process ignores SIGCHLD (ECHILD)
int runProcess(const char* program, const std::vector<std::string>& arguments);

} // namespace Bluetooth

#endif
