// SPDX-License-Identifier: LGPL-2.1-or-later
#include "bluez/hci_version.h"

#include "core/process.h"

#include <libgen.h>

#include <chrono>
#include <cstdio>
#include <memory>

namespace Bluetooth {

const char* const hciconfigProgram = "/usr/bin/hciconfig";

std::string controllerName(const char* path) {
    std::string copy = path; // basename() may write into its argument
    return ::basename(copy.data());
}

namespace {

/// A controller that hangs would otherwise keep it, and who asks, for ever.
constexpr std::chrono::seconds limit{5};

std::string scanVersion(FILE* output) {
    char line[1024];
    char version[sizeof line];
    while (std::fgets(line, sizeof line, output)) {
        if (std::sscanf(line, "\tHCI Version: %1023s", version) == 1)
            return version;
    }
    return {};
}

} // namespace

bool readHciVersion(const std::string& controller, std::string& version) {
    const std::unique_ptr<ProcessReader> tool =
        ProcessReader::open(hciconfigProgram, {controller, "-a"}, limit);
    if (!tool)
        return false;
    version = scanVersion(tool->stream());
    return !version.empty() || !tool->isOverdue();
}

} // namespace Bluetooth
