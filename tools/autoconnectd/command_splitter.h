// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_COMMAND_SPLITTER_H
#define KESBT_AUTOCONNECTD_COMMAND_SPLITTER_H

#include <string>
#include <string_view>
#include <vector>

namespace AutoConnectd {

enum class Command { Reload, Pause, Resume };

/// Tells commands apart that come without any separator, such as "1pause1", in pieces of any size.
class CommandSplitter {
public:
    /// Takes the next bytes. White space and NUL bytes between commands are passed over.
    /// @return the commands that are complete now, in order
    std::vector<Command> feed(std::string_view bytes);

    /// The bytes that were no command since the last call.
    std::string takeUnknown();

private:
    std::string m_pending; // the beginning of a command
    std::string m_unknown;
};

} // namespace AutoConnectd

#endif
