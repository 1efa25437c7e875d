// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_STDOUT_CAPTURE_H
#define KESBLUETOOTH_TESTS_STDOUT_CAPTURE_H

#include <sys/mman.h>
#include <unistd.h>

#include <iostream>
#include <string>

namespace Bluetooth::Test {

/// What this process writes to standard output while this object lives.
class StdoutCapture {
public:
    StdoutCapture() {
        std::cout << std::flush;
        dup2(m_file, STDOUT_FILENO);
    }
    ~StdoutCapture() {
        std::cout << std::flush;
        dup2(m_original, STDOUT_FILENO);
        close(m_original);
        close(m_file);
    }
    StdoutCapture(const StdoutCapture&) = delete;
    StdoutCapture& operator=(const StdoutCapture&) = delete;

    /// @return what has been written and flushed since the last call
    std::string take() {
        std::string text(4096, '\0');
        const ssize_t length = pread(m_file, text.data(), text.size(), m_taken);
        text.resize(length < 0 ? 0 : static_cast<std::size_t>(length));
        m_taken += length;
        return text;
    }

private:
    int m_original = dup(STDOUT_FILENO);
    int m_file = memfd_create("output", MFD_CLOEXEC);
    off_t m_taken = 0;
};

} // namespace Bluetooth::Test

#endif
