#include "support/stdout_capture.h"

#include "support/child_process.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <iostream>
#include <stdexcept>

namespace Bluetooth::Test {

StdoutCapture::StdoutCapture() {
    std::cout << std::flush;
    std::fflush(stdout);
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        throw std::runtime_error("no pipe for standard output");
    m_original = fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, 3);
    dup2(ends[1], STDOUT_FILENO);
    close(ends[1]);
    m_input = ends[0];
}

StdoutCapture::~StdoutCapture() {
    std::cout << std::flush;
    std::fflush(stdout);
    dup2(m_original, STDOUT_FILENO);
    close(m_original);
    close(m_input);
}

std::string StdoutCapture::readLine(Milliseconds limit) {
    std::string line;
    while (!takeLine(m_buffer, line)) {
        if (!readMore(m_input, m_buffer, limit))
            return {};
    }
    return line;
}

std::string StdoutCapture::take() {
    std::cout << std::flush; // only what the library flushed itself is seen by readLine()
    while (readMore(m_input, m_buffer, Milliseconds(0))) {
    }
    return std::exchange(m_buffer, {});
}

} // namespace Bluetooth::Test
