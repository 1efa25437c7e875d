// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMON_DAEMON_PROGRAM_H
#define KESBT_COMMON_DAEMON_PROGRAM_H

#include <CLI/CLI.hpp>

#include <optional>
#include <string>

namespace Tools {

/// What a daemon does around its work: its command line, its log, and how it fails.
class DaemonProgram {
public:
    /// @param name        not copied
    /// @param description for --help
    DaemonProgram(const char* name, const char* description);

    const char* name() const { return m_name; }
    /// To add options to; --help and --version are there.
    CLI::App& commandLine() { return m_commandLine; }

    /// Reads the command line and opens the log. Standard descriptors are open afterwards.
    /// @return what to exit with, when there is no more to be done: 0 after --help and --version,
    ///         2 after wrong usage, told in one line on standard error
    std::optional<int> start(int argc, char** argv);

    /// Tells in one line, on standard error and in the log, why the program ends.
    /// @param problem with what the user should do
    /// @return what to exit with
    int fail(const std::string& problem) const;

private:
    const char* m_name;
    CLI::App m_commandLine;
};

} // namespace Tools

#endif
