// SPDX-License-Identifier: LGPL-2.1-or-later
#include "options.h"

#include "serving.h"
#include "serving/bus/glib_ptr.h"

#include <stdexcept>

namespace Bluetooth::Sim {

namespace {

constexpr const char* summary =
    "A simulated BlueZ 4 daemon: org.bluez without hardware.\n\n"
    "With COMMAND, starts a private system bus and session bus with the daemon on\n"
    "them, runs the command there and exits with its status. Without, serves on the\n"
    "system bus until SIGTERM.";

struct Raw {
    char* scenario = nullptr;
    char** sessionServices = nullptr;
    char** command = nullptr;
    gboolean printReady = FALSE;
    gboolean verbose = FALSE;
    gboolean noDaemon = FALSE;
    gboolean listScenario = FALSE;
    gboolean listBehaviours = FALSE;
    gboolean version = FALSE;

    Raw() = default;
    Raw(const Raw&) = delete;
    Raw& operator=(const Raw&) = delete;
    ~Raw() {
        g_free(scenario);
        g_strfreev(sessionServices);
        g_strfreev(command);
    }
};

std::vector<std::string> texts(char** array) {
    std::vector<std::string> result;
    for (char** text = array; text && *text; ++text)
        result.emplace_back(*text);
    return result;
}

} // namespace

SimOptions parseOptions(int argc, char** argv) {
    SimOptions options;
    Raw raw;
    const GOptionEntry entries[] = {
        {"scenario", 's', 0, G_OPTION_ARG_FILENAME, &raw.scenario,
         "Adapters and devices (default: a built-in scenario)", "FILE"},
        {"time-scale", 't', 0, G_OPTION_ARG_DOUBLE, &options.timeScale,
         "Multiply all simulated times, e.g. 0.01", "X"},
        {"ready-fd", 0, 0, G_OPTION_ARG_INT, &options.readyFd,
         "Write a line there once the adapters are up", "FD"},
        {"print-ready", 0, 0, G_OPTION_ARG_NONE, &raw.printReady, "The same on standard output",
         nullptr},
        {"verbose", 'v', 0, G_OPTION_ARG_NONE, &raw.verbose, "Write each call to standard error",
         nullptr},
        {"no-daemon", 0, 0, G_OPTION_ARG_NONE, &raw.noDaemon,
         "Private buses only: the command misses the daemon", nullptr},
        {"session-services", 0, 0, G_OPTION_ARG_FILENAME_ARRAY, &raw.sessionServices,
         "Service files for the session bus (repeatable)", "DIR"},
        {"list-scenario", 0, 0, G_OPTION_ARG_NONE, &raw.listScenario,
         "Print the built-in scenario and exit", nullptr},
        {"list-behaviours", 0, 0, G_OPTION_ARG_NONE, &raw.listBehaviours,
         "Print the behaviours of devices and exit", nullptr},
        {"version", 0, 0, G_OPTION_ARG_NONE, &raw.version, "Print the version and exit", nullptr},
        {G_OPTION_REMAINING, 0, 0, G_OPTION_ARG_FILENAME_ARRAY, &raw.command, nullptr, nullptr},
        {nullptr, 0, 0, G_OPTION_ARG_NONE, nullptr, nullptr, nullptr}};

    const GlibPtr<GOptionContext> context(g_option_context_new("[-- COMMAND [ARGUMENT...]]"));
    g_option_context_set_summary(context.get(), summary);
    g_option_context_set_strict_posix(context.get(), TRUE);
    g_option_context_add_main_entries(context.get(), entries, nullptr);
    ErrorOut error;
    if (!g_option_context_parse(context.get(), &argc, &argv, error.out()))
        throw std::runtime_error(error->message);
    if (!(options.timeScale >= 0 && options.timeScale <= 1000))
        throw std::runtime_error("a time scale is from 0 to 1000");

    options.scenario = raw.scenario ? raw.scenario : "";
    options.printReady = raw.printReady != FALSE;
    options.verbose = raw.verbose != FALSE;
    options.noDaemon = raw.noDaemon != FALSE;
    options.listScenario = raw.listScenario != FALSE;
    options.listBehaviours = raw.listBehaviours != FALSE;
    options.version = raw.version != FALSE;
    options.sessionServices = texts(raw.sessionServices);
    options.command = texts(raw.command);
    if (!options.command.empty() && options.command.front() == "--")
        options.command.erase(options.command.begin());
    if (options.noDaemon && options.command.empty())
        throw std::runtime_error("--no-daemon needs a COMMAND");
    return options;
}

} // namespace Bluetooth::Sim
