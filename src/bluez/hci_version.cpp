// SPDX-License-Identifier: LGPL-2.1-or-later
#include "bluez/hci_version.h"

#include "core/process.h"

#include <libgen.h>

#include <cstdio>
#include <memory>

namespace Bluetooth {

const char* const hciconfigProgram = "/usr/bin/hciconfig";

std::string controllerName(const char* path) {
    std::string copy = path; // basename() may write into its argument
    return ::basename(copy.data());
}

namespace {
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
        ProcessReader::open(hciconfigProgram, {controller, "-a"});
    if (!tool)
        return false;
    version = scanVersion(tool->stream());
    return true;
}

} // namespace Bluetooth
