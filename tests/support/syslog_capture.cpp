// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/syslog_capture.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>

namespace Bluetooth::Test {

namespace {

Recorder<std::string>& lines() {
    static auto& recorder = *new Recorder<std::string>; // logged to until the very end
    return recorder;
}

void record(int priority, const char* format, va_list args) {
    char* text = nullptr;
    if (vasprintf(&text, format, args) < 0)
        return;
    std::string line = text;
    free(text);
    const std::size_t colon = line.find(".cpp:") + 4;
    const std::size_t end = line.find_first_not_of("0123456789", colon + 1);
    if (colon < line.find(' ') && end != std::string::npos && line[end] == ' ')
        line.erase(colon, end - colon);
    if (priority != LOG_ERR)
        line += " (priority " + std::to_string(priority) + ")";
    lines().add(line);
}

} // namespace

Texts SyslogCapture::take() {
    Texts texts = lines().events();
    lines().clear();
    return texts;
}

} // namespace Bluetooth::Test

// The library's calls end here, however it was compiled.
// NOLINTBEGIN(bugprone-reserved-identifier,cert-dcl*,readability-inconsistent-declaration*)
extern "C" {

void syslog(int priority, const char* format, ...) {
    va_list args;
    va_start(args, format);
    Bluetooth::Test::record(priority, format, args);
    va_end(args);
}

void __syslog_chk(int priority, int /*flag*/, const char* format, ...) {
    va_list args;
    va_start(args, format);
    Bluetooth::Test::record(priority, format, args);
    va_end(args);
}
}
// NOLINTEND(bugprone-reserved-identifier,cert-dcl*,readability-inconsistent-declaration*)
