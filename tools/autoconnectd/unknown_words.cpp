// SPDX-License-Identifier: LGPL-2.1-or-later
#include "unknown_words.h"

#include <syslog.h>

namespace AutoConnectd {

namespace {

constexpr std::size_t longest = 64; // bytes
constexpr std::chrono::seconds pause{1};

std::string escaped(const std::string& bytes) {
    constexpr const char* digits = "0123456789ABCDEF";
    std::string text;
    for (const char byte : bytes) {
        const auto value = static_cast<unsigned char>(byte);
        if (value >= ' ' && value <= '~' && value != '\\')
            text += byte;
        else
            text.append("\\x").append(1, digits[value / 16]).append(1, digits[value % 16]);
    }
    return text;
}

} // namespace

void UnknownWords::add(std::string_view bytes) {
    const std::string_view kept = bytes.substr(0, longest - m_text.size());
    m_text += kept;
    m_isCut = m_isCut || kept.size() < bytes.size();
}

void UnknownWords::log(Clock::time_point now) {
    if (now < due())
        return;
    syslog(LOG_WARNING, "no command: \"%s\"%s", escaped(m_text).c_str(), m_isCut ? " ..." : "");
    m_text.clear();
    m_isCut = false;
    m_due = now + pause;
}

} // namespace AutoConnectd
