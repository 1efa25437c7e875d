#ifndef KESBLUETOOTH_TESTS_STDOUT_CAPTURE_H
#define KESBLUETOOTH_TESTS_STDOUT_CAPTURE_H

#include "support/latch.h"

#include <string>

namespace Bluetooth::Test {

/// What this process writes to standard output while this object lives. Holds as much as a pipe.
class StdoutCapture {
public:
    StdoutCapture();
    ~StdoutCapture();
    StdoutCapture(const StdoutCapture&) = delete;
    StdoutCapture& operator=(const StdoutCapture&) = delete;

    /// @return the next line without its newline, awaited; "" in time-out
    std::string readLine(Milliseconds limit = patience);
    /// @return what has been written and not been read
    std::string take();

private:
    int m_original = -1;
    int m_input = -1;
    std::string m_buffer;
};

} // namespace Bluetooth::Test

#endif
