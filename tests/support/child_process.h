// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_CHILD_PROCESS_H
#define KESBLUETOOTH_TESTS_CHILD_PROCESS_H

#include "support/latch.h"

#include <sys/types.h>

#include <ostream>
#include <string>
#include <vector>

namespace Bluetooth::Test {

/// What a program has left behind.
struct Result {
    int status;
    std::string out;
    std::string err;

    bool operator==(const Result& other) const {
        return status == other.status && out == other.out && err == other.err;
    }
};
inline std::ostream& operator<<(std::ostream& stream, const Result& result) {
    return stream << "status " << result.status << "\nout: " << result.out
                  << "\nerr: " << result.err;
}

/// A program that runs beside the test. It is killed when this object or the test's process ends.
class ChildProcess {
public:
    /// At a terminal only standard output is a pipe: input and errors are the terminal's.
    enum class Output { Inherit, Capture, Terminal };

    /// Starts a program found through PATH. A failure to start throws std::runtime_error.
    /// @param environment "NAME=VALUE" each, added to the test's own
    explicit ChildProcess(std::vector<std::string> command, Output output = Output::Inherit,
                          std::vector<std::string> environment = {});
    ~ChildProcess();
    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    pid_t pid() const { return m_pid; }
    void signal(int number) const;
    /// Ends it at once (SIGKILL) and waits.
    void kill();
    /// @return the exit status, 128 + N after signal N, -1 when it has not ended in time
    int wait(Milliseconds limit = patience);
    bool hasEnded() { return wait(Milliseconds(0)) >= 0; }
    /// Waits for the end, with the output captured.
    Result finish();

    /// @return the next line of standard output without its newline; "" at its end or in time-out
    std::string readLine(Milliseconds limit = patience);
    /// @return all that is left of standard output, read to its end
    std::string readAll(Milliseconds limit = patience);
    /// The same for standard error, only after standard output has been read to its end.
    std::string readErrors(Milliseconds limit = patience);

    /// Waits until the program at the terminal has written this. @return what came until then
    std::string readUntil(const std::string& prompt, Milliseconds limit = patience);
    /// Types at the terminal: "\x03" is Ctrl-C.
    void type(const std::string& keys) const;

private:
    pid_t m_pid = -1;
    int m_status = -1;
    int m_output = -1;
    int m_errors = -1;
    std::string m_buffer;
    std::string m_errorBuffer;
};

} // namespace Bluetooth::Test

#endif
