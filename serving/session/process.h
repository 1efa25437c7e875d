// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_SESSION_PROCESS_H
#define KESBLUETOOTH_SERVING_SESSION_PROCESS_H

#include <string>
#include <vector>

#include <sys/types.h>

namespace Bluetooth::Serving {

/// An array of C strings, as exec and its relatives want it; valid as long as the strings are.
std::vector<char*> cStrings(const std::vector<std::string>& strings);

/// The environment of this process with some variables replaced ("NAME=VALUE") or, when an entry
/// has no "=", removed.
std::vector<std::string> environmentWith(const std::vector<std::string>& changes);

/// The path of the running program.
/// @throw std::runtime_error  with a text for the user
std::string ownProgram();

/// Tells whoever started this program as a helper that it serves now.
/// @param fd  the descriptor that the helper was given for it
/// @param program  this program's name, for the message on stderr when nobody else can show it
void tellReady(int fd, const char* program);

/// Asks a child to end, waits, kills it after a while, and reaps it.
void endProcess(pid_t pid);

/// A helper process of ours: in a process group of its own, so that Ctrl-C does not reach it, and
/// ended with this object, or when we die. What it prints goes to our standard error.
class HelperProcess {
public:
    /// Starts it and waits until it has written a line, or closed the pipe for it.
    /// @param lineFd  the descriptor on which it writes to us
    /// @throw std::runtime_error  with a text for the user
    HelperProcess(const std::vector<std::string>& arguments,
                  const std::vector<std::string>& environment, int lineFd);
    HelperProcess(const HelperProcess&) = delete;
    HelperProcess& operator=(const HelperProcess&) = delete;
    ~HelperProcess() { endProcess(m_pid); }

    pid_t pid() const { return m_pid; }
    /// The line without its newline; "" when there was none.
    const std::string& line() const { return m_line; }

private:
    pid_t m_pid = 0;
    std::string m_line;
};

} // namespace Bluetooth::Serving

#endif
