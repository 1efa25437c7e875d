// SPDX-License-Identifier: LGPL-2.1-or-later
#include "common/daemon_program.h"

#include "common/standard_descriptors.h"

#include <syslog.h>

#include <cstdlib>
#include <iostream>

namespace Tools {

DaemonProgram::DaemonProgram(const char* name, const char* description)
    : m_name(name), m_commandLine(description, name) {
    m_commandLine.set_version_flag("--version", std::string(name) + ' ' + KESBLUETOOTH_VERSION);
}

std::optional<int> DaemonProgram::start(int argc, char** argv) {
    openStandardDescriptors(); // a daemon that nobody hears works all the same
    try {
        m_commandLine.parse(argc, argv);
    } catch (const CLI::ParseError& problem) {
        if (problem.get_exit_code() == 0) // --help, --version
            return m_commandLine.exit(problem);
        std::cerr << m_name << ": " << problem.what() << "; see " << m_name << " --help\n";
        constexpr int wrongUsage = 2;
        return wrongUsage;
    }
    openlog(m_name, LOG_PID, LOG_DAEMON);
    return std::nullopt;
}

int DaemonProgram::fail(const std::string& problem) const {
    std::cerr << m_name << ": " << problem << std::endl;
    syslog(LOG_CRIT, "%s", problem.c_str());
    return EXIT_FAILURE;
}

} // namespace Tools
