#include "support/syslog_capture.h"

#include <syslog.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>

namespace Bluetooth::Test {

namespace {

Recorder<LogLine>& lines() {
    static auto& recorder = *new Recorder<LogLine>; // logged to until the very end
    return recorder;
}

void record(int priority, const char* format, va_list args) {
    char* text = nullptr;
    if (vasprintf(&text, format, args) < 0)
        return;
    lines().add({priority, text});
    free(text);
}

} // namespace

std::string LogLine::withoutNumber() const {
    std::string result = text;
    const std::size_t colon = text.find(".cpp:") + 4;
    const std::size_t end = text.find_first_not_of("0123456789", colon + 1);
    if (colon < text.find(' ') && end != std::string::npos && text[end] == ' ')
        result.erase(colon, end - colon);
    if (priority != LOG_ERR)
        result += " (priority " + std::to_string(priority) + ")";
    return result;
}

SyslogCapture::SyslogCapture() {
    lines().clear();
}

SyslogCapture::~SyslogCapture() {
    lines().clear();
}

std::vector<std::string> SyslogCapture::take() {
    std::vector<std::string> texts;
    for (const LogLine& line : lines().events())
        texts.push_back(line.withoutNumber());
    lines().clear();
    return texts;
}

bool SyslogCapture::waitFor(const std::string& text, Milliseconds limit) const {
    return lines().waitUntil(
        [&](const std::vector<LogLine>& all) {
            return std::any_of(all.begin(), all.end(),
                               [&](const LogLine& line) { return line.withoutNumber() == text; });
        },
        limit);
}

bool SyslogCapture::waitForCount(std::size_t count, Milliseconds limit) const {
    return lines().waitFor(count, limit);
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

void vsyslog(int priority, const char* format, va_list args) {
    Bluetooth::Test::record(priority, format, args);
}

void __syslog_chk(int priority, int /*flag*/, const char* format, ...) {
    va_list args;
    va_start(args, format);
    Bluetooth::Test::record(priority, format, args);
    va_end(args);
}

void __vsyslog_chk(int priority, int /*flag*/, const char* format, va_list args) {
    Bluetooth::Test::record(priority, format, args);
}
}
// NOLINTEND(bugprone-reserved-identifier,cert-dcl*,readability-inconsistent-declaration*)
