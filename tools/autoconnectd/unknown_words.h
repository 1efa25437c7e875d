// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_UNKNOWN_WORDS_H
#define KESBT_AUTOCONNECTD_UNKNOWN_WORDS_H

#include <chrono>
#include <string>
#include <string_view>

namespace AutoConnectd {

/// Logs what was no command: one line a second at most, however much comes, with what is no
/// printable ASCII escaped.
class UnknownWords {
public:
    using Clock = std::chrono::steady_clock;

    /// The beginning is kept until it is logged.
    void add(std::string_view bytes);
    /// Logs what has come, when that is due.
    void log(Clock::time_point now);
    /// When log() has something to do.
    Clock::time_point due() const { return m_text.empty() ? Clock::time_point::max() : m_due; }

private:
    std::string m_text;
    bool m_isCut = false;
    Clock::time_point m_due{};
};

} // namespace AutoConnectd

#endif
