// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_COMMAND_PIPE_H
#define KESBT_AUTOCONNECTD_COMMAND_PIPE_H

#include "command_splitter.h"

#include <bluetooth/fifo.h>

#include <memory>
#include <string>
#include <vector>

namespace AutoConnectd {

/// The reading end of the command pipe.
///
/// Beside the end that is read, the pipe is held open for writing: opening it then waits for
/// nobody, its end is never reached when a sender closes, and a command that arrives between two
/// reads stays in the pipe.
class CommandPipe {
public:
    ~CommandPipe();

    /// Opens the pipe, creating it when it is missing.
    /// @return null with `problem` set to what the user should do
    static std::unique_ptr<CommandPipe> open(const std::string& path, std::string& problem);

    /// To be watched for input.
    int descriptor() const { return m_keeper; }

    /// Whether the pipe at the path is still this one: the folder may have been cleaned up.
    bool isCurrent() const;

    /// Reads what has arrived; to be called when the descriptor has input. Several reloads in a
    /// row become one.
    std::vector<Command> read();

private:
    CommandPipe(const std::string& path, int keeper) : m_path(path), m_keeper(keeper) {}

    std::string m_path;
    int m_keeper;
    std::unique_ptr<Bluetooth::Fifo> m_fifo;
    CommandSplitter m_splitter;
};

} // namespace AutoConnectd

#endif
