// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_SYSLOG_CAPTURE_H
#define KESBLUETOOTH_TESTS_SYSLOG_CAPTURE_H

#include "support/latch.h"

namespace Bluetooth::Test {

/// What is written to the system log while this object lives. The test executable's own syslog()
/// takes the place of the C library's, so nothing reaches the machine's log.
class SyslogCapture {
public:
    SyslogCapture() { take(); }
    ~SyslogCapture() { take(); }
    SyslogCapture(const SyslogCapture&) = delete;
    SyslogCapture& operator=(const SyslogCapture&) = delete;

    /// The lines so far without their numbers, which say nothing: "adapter.cpp No such adapter";
    /// forgotten by this. One that was not of error priority ends in " (priority N)".
    Texts take();
};

} // namespace Bluetooth::Test

#endif
