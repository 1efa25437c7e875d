// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_FAILURE_H
#define KESBT_SHOW_FAILURE_H

#include <stdexcept>
#include <string>

namespace Kesbt {

/// Why the program ends without success: one line that says what to do, and the exit status.
class Failure : public std::runtime_error {
public:
    explicit Failure(const std::string& line, int exitStatus = 1)
        : std::runtime_error(line), m_status(exitStatus) {}
    int status() const { return m_status; }

private:
    int m_status;
};

/// Arguments that cannot be meant so (status 2).
inline Failure wrongUsage(const std::string& line) {
    return Failure(line, 2);
}

} // namespace Kesbt

#endif
