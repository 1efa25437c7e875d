// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command_splitter.h"

#include <utility>

namespace AutoConnectd {

namespace {

struct Word {
    std::string_view text;
    Command command;
};

constexpr Word words[] = {
    {"1", Command::Reload}, {"pause", Command::Pause}, {"resume", Command::Resume}};

bool isBetween(char byte) {
    return byte == '\0' || byte == ' ' || (byte >= '\t' && byte <= '\r');
}

/// Whether some command begins with this text.
bool mayBecomeCommand(std::string_view text) {
    for (const Word& word : words) {
        if (word.text.substr(0, text.size()) == text)
            return true;
    }
    return false;
}

} // namespace

std::vector<Command> CommandSplitter::feed(std::string_view bytes) {
    std::vector<Command> commands;
    for (const char byte : bytes) {
        if (isBetween(byte)) {
            m_unknown += std::exchange(m_pending, "");
            continue;
        }
        m_pending += byte;
        while (!mayBecomeCommand(m_pending)) {
            m_unknown += m_pending.front();
            m_pending.erase(0, 1);
        }
        for (const Word& word : words) {
            if (m_pending == word.text) {
                commands.push_back(word.command);
                m_pending.clear();
            }
        }
    }
    return commands;
}

std::string CommandSplitter::takeUnknown() {
    return std::exchange(m_unknown, "");
}

} // namespace AutoConnectd
