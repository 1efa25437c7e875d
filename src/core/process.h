// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_PROCESS_H
#define KESBLUETOOTH_CORE_PROCESS_H

#include <sys/types.h>

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
    /// @return null with errno set when it cannot be started (missing, not executable)
    static std::unique_ptr<ProcessReader> open(const char* program,
                                               const std::vector<std::string>& arguments);

    ProcessReader(const ProcessReader&) = delete;
    ProcessReader& operator=(const ProcessReader&) = delete;

    /// Closes the stream and waits for the program to end.
    ~ProcessReader();

    /// What the program writes. Closed by the destructor.
    FILE* stream() const { return m_stream; }

private:
    ProcessReader() = default;

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
