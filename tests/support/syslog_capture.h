#ifndef KESBLUETOOTH_TESTS_SYSLOG_CAPTURE_H
#define KESBLUETOOTH_TESTS_SYSLOG_CAPTURE_H

#include "support/latch.h"

#include <ostream>
#include <string>
#include <vector>

namespace Bluetooth::Test {

/// One line written to the system log.
struct LogLine {
    int priority;
    std::string text; ///< "adapter.cpp:35 No such adapter"

    /// Without the line's number, which says nothing: "adapter.cpp No such adapter".
    std::string withoutNumber() const;
};

/// What is written to the system log while this object lives. The test executable's own syslog()
/// takes the place of the C library's, so nothing reaches the machine's log.
class SyslogCapture {
public:
    SyslogCapture();
    ~SyslogCapture();
    SyslogCapture(const SyslogCapture&) = delete;
    SyslogCapture& operator=(const SyslogCapture&) = delete;

    /// The lines so far, without their numbers; forgotten by this. Each must have come at error
    /// priority; one that did not ends in " (priority N)".
    std::vector<std::string> take();

    /// @return whether `text` ("file.cpp MESSAGE") has come among the lines not yet taken
    bool waitFor(const std::string& text, Milliseconds limit = patience) const;
    bool waitForCount(std::size_t count, Milliseconds limit = patience) const;
};

} // namespace Bluetooth::Test

#endif
