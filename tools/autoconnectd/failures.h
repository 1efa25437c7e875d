// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_FAILURES_H
#define KESBT_AUTOCONNECTD_FAILURES_H

#include <ctime>
#include <set>
#include <string>

namespace AutoConnectd {

/// Logs attempts that fail, at a pace that a person can read: each reason once, and then, after
/// twice as many attempts each time, how many there were.
class Failures {
public:
    /// @param what what is connected, for the log
    explicit Failures(std::string what) : m_what(std::move(what)) {}

    void add(const std::string& reason);
    /// Forgets them, since an attempt has succeeded.
    /// @return how many there were, for the log; "" for none
    std::string end();

private:
    std::string summary() const;

    std::string m_what;
    std::set<std::string> m_reasons;
    int m_count = 0;
    int m_nextReport = 0;
    std::time_t m_since = 0;
};

} // namespace AutoConnectd

#endif
