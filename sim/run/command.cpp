// SPDX-License-Identifier: LGPL-2.1-or-later
#include "run/command.h"

#include "serving.h"
#include "serving/bus/glib_ptr.h"
#include "serving/session/session.h"
#include "world/scenario.h"

namespace Bluetooth::Sim {

namespace {

/// The service files that were installed with this program, after those that were named.
std::vector<std::string> serviceFolders(const SimOptions& options) {
    std::vector<std::string> folders = options.sessionServices;
    const GlibPtr<char> bin(g_path_get_dirname(ownProgram().c_str()));
    const GlibPtr<char> prefix(g_path_get_dirname(bin.get()));
    const std::string installed = std::string(prefix.get()) + "/share/dbus-1/services";
    if (g_file_test(installed.c_str(), G_FILE_TEST_IS_DIR))
        folders.push_back(installed);
    return folders;
}

/// The command line by which this program serves in a process of its own, which a test may kill.
std::vector<std::string> daemonArguments(const SimOptions& options) {
    char scale[G_ASCII_DTOSTR_BUF_SIZE];
    g_ascii_dtostr(scale, sizeof scale, options.timeScale);
    std::vector<std::string> arguments = {ownProgram(),
                                          "--ready-fd=" + std::to_string(Session::readyFd),
                                          std::string("--time-scale=") + scale};
    if (!options.scenario.empty())
        arguments.push_back("--scenario=" + options.scenario);
    if (options.verbose)
        arguments.emplace_back("--verbose");
    return arguments;
}

} // namespace

int runCommand(const SimOptions& options) {
    if (!options.noDaemon && !options.scenario.empty())
        loadScenario(options.scenario); // a wrong one is told before anything is started
    Session session("bluez4-sim");
    session.startBus(systemBus);
    if (!options.noDaemon)
        session.startHelper(daemonArguments(options), "the simulated daemon");
    session.startBus(sessionBus, serviceFolders(options));
    return session.run(options.command);
}

} // namespace Bluetooth::Sim
