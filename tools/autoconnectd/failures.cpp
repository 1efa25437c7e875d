// SPDX-License-Identifier: LGPL-2.1-or-later
#include "failures.h"

#include <syslog.h>

#include <utility>

namespace AutoConnectd {

namespace {

constexpr std::size_t mostReasons = 8; // of a daemon that always finds another
constexpr int firstReport = 4;         // attempts

} // namespace

void Failures::add(const std::string& reason) {
    if (m_count++ == 0) {
        m_since = std::time(nullptr);
        m_nextReport = firstReport;
    }
    const bool isNew = m_reasons.size() < mostReasons && m_reasons.insert(reason).second;
    if (isNew)
        syslog(LOG_WARNING, "%s cannot be connected (%s); trying again", m_what.c_str(),
               reason.c_str());
    if (m_count < m_nextReport)
        return;
    m_nextReport = m_count * 2;
    syslog(LOG_NOTICE, "%s is still not connected after %s", m_what.c_str(), summary().c_str());
}

std::string Failures::end() {
    std::string text = m_count == 0 ? "" : summary();
    m_count = 0;
    m_reasons.clear();
    return text;
}

std::string Failures::summary() const {
    char since[sizeof "2000-01-01 00:00"] = "";
    tm local{};
    if (!localtime_r(&m_since, &local) || strftime(since, sizeof since, "%F %R", &local) == 0)
        since[0] = '\0';
    return std::to_string(m_count) + " failed attempt" + (m_count == 1 ? "" : "s") + " since " +
           since;
}

} // namespace AutoConnectd
