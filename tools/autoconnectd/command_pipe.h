// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_COMMAND_PIPE_H
#define KESBT_AUTOCONNECTD_COMMAND_PIPE_H

#include "command_splitter.h"
#include "unknown_words.h"

#include <memory>
#include <string>
#include <vector>

namespace AutoConnectd {

/// The daemon's end of the command pipe: this user's own, which nobody else may open, and which one
/// daemon reads.
///
/// It is open for writing too: opening it waits for nobody, its end is never reached when a sender
/// closes, and a command that arrives between two reads stays in the pipe. Nothing blocks.
class CommandPipe {
public:
    ~CommandPipe();
    CommandPipe(const CommandPipe&) = delete;
    CommandPipe& operator=(const CommandPipe&) = delete;

    /// Opens the pipe, creating it when it is missing. What else stands at the path is refused, and
    /// replaced where this user is root; a folder that is not empty is renamed.
    /// @return null with `problem` set to what the user should do
    static std::unique_ptr<CommandPipe> open(const std::string& path, std::string& problem);

    const std::string& path() const { return m_path; }
    /// To be watched for input: commands.
    int descriptor() const { return m_descriptor; }
    /// To be watched for input: isCurrent() may have changed. -1 when that cannot be watched.
    int watchDescriptor() const { return m_watch; }

    /// Whether the pipe at the path is still this one: the folder may have been cleaned up.
    bool isCurrent() const;

    /// Reads what has arrived. Several reloads in a row become one.
    std::vector<Command> read();

    /// What came and was no command.
    UnknownWords& unknown() { return m_unknown; }

private:
    CommandPipe(const std::string& path, int descriptor) : m_path(path), m_descriptor(descriptor) {}

    void watch();

    std::string m_path;
    int m_descriptor;
    int m_watch = -1;
    CommandSplitter m_splitter;
    UnknownWords m_unknown;
};

} // namespace AutoConnectd

#endif
