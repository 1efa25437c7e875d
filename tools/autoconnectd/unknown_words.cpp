// SPDX-License-Identifier: LGPL-2.1-or-later
#include "unknown_words.h"

#include "shown_text.h"

#include <syslog.h>

namespace AutoConnectd {

namespace {

constexpr std::size_t longest = 64; // bytes
constexpr std::chrono::seconds pause{1};

} // namespace

void UnknownWords::add(std::string_view bytes) {
    const std::string_view kept = bytes.substr(0, longest - m_text.size());
    m_text += kept;
    m_isCut = m_isCut || kept.size() < bytes.size();
}

void UnknownWords::log(Clock::time_point now) {
    if (now < due())
        return;
    syslog(LOG_WARNING, "no command: \"%s\"%s", shownText(m_text).c_str(), m_isCut ? " ..." : "");
    m_text.clear();
    m_isCut = false;
    m_due = now + pause;
}

} // namespace AutoConnectd
