// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/session.h"

#include "serving/bus/glib_ptr.h"
#include "serving/session/bus_configuration.h"

#include <algorithm>
#include <fstream>
#include <stdexcept>

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Bluetooth::Serving {

namespace {

constexpr int notFound = 127;
constexpr int notExecutable = 126;

/// What a bus gives to the services that it starts, and to nobody else.
const std::vector<std::string> starterVariables = {"DBUS_STARTER_ADDRESS", "DBUS_STARTER_BUS_TYPE"};

std::vector<std::string> operator+(std::vector<std::string> first,
                                   const std::vector<std::string>& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
}

struct CommandRun {
    GMainLoop* loop;
    pid_t pid;
    int status;
};

int exitStatus(int status) {
    return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
}

} // namespace

Session::Session(std::string program) : m_program(std::move(program)), m_folder(m_program) {
    // Whoever loses its parent in here becomes our child, so that nothing outlives the session.
    prctl(PR_SET_CHILD_SUBREAPER, 1);
}

Session::~Session() {
    while (!m_helpers.empty())
        m_helpers.pop_back();
    endOrphans(); // started meanwhile
}

std::vector<std::string> Session::helperEnvironment() const {
    return environmentWith(starterVariables +
                           std::vector<std::string>{systemBus.variable, sessionBus.variable} +
                           m_addresses);
}

void Session::startBus(const BusKind& kind, const std::vector<std::string>& serviceFolders) {
    constexpr int addressFd = 3;
    const std::string base = m_folder.path() + "/" + kind.name;
    const std::string file = base + ".conf";
    if (!(std::ofstream(file) << busConfiguration(kind.name, base + "_bus", serviceFolders)))
        throw std::runtime_error("cannot write " + file);
    const std::vector<std::string> arguments = {
        "dbus-daemon",           "--nofork",
        "--nopidfile",           "--syslog-only",
        "--config-file=" + file, "--print-address=" + std::to_string(addressFd)};
    auto bus = std::make_unique<HelperProcess>(arguments, helperEnvironment(), addressFd);
    if (bus->line().empty())
        throw std::runtime_error(std::string("dbus-daemon has not started a ") + kind.name +
                                 " bus");
    m_addresses.push_back(std::string(kind.variable) + "=" + bus->line());
    m_helpers.push_back(std::move(bus));
}

void Session::startHelper(const std::vector<std::string>& arguments,
                          const std::string& description) {
    auto helper = std::make_unique<HelperProcess>(arguments, helperEnvironment(), readyFd);
    if (helper->line().empty())
        throw std::runtime_error(description + " has not started");
    m_helpers.push_back(std::move(helper));
}

int Session::run(const std::vector<std::string>& command) {
    if (const int signal = m_relay.early())
        return 128 + signal;
    const int status = spawnAndWait(command);
    // Before the buses, whose loss they would report.
    endOrphans();
    return status;
}

int Session::spawnAndWait(const std::vector<std::string>& command) {
    const auto environment = environmentWith(starterVariables + m_addresses);
    auto arguments = cStrings(command);
    auto variables = cStrings(environment);
    CommandRun running{g_main_loop_new(nullptr, FALSE), 0, 0};
    ErrorOut error;
    const auto flags =
        static_cast<GSpawnFlags>(G_SPAWN_DO_NOT_REAP_CHILD | G_SPAWN_SEARCH_PATH |
                                 G_SPAWN_CHILD_INHERITS_STDIN | G_SPAWN_LEAVE_DESCRIPTORS_OPEN);
    if (!g_spawn_async(nullptr, arguments.data(), variables.data(), flags, nullptr, nullptr,
                       &running.pid, error.out())) {
        g_main_loop_unref(running.loop);
        return cannotRun(command.front());
    }
    m_relay.setTarget(running.pid);
    g_child_watch_add(
        running.pid,
        [](GPid, gint status, gpointer data) {
            auto* ended = static_cast<CommandRun*>(data);
            ended->status = status;
            g_main_loop_quit(ended->loop);
        },
        &running);
    g_main_loop_run(running.loop);
    m_relay.setTarget(0);
    g_main_loop_unref(running.loop);
    return exitStatus(running.status);
}

/// @return the status that a shell gives for it
int Session::cannotRun(const std::string& command) const {
    const bool isPath = command.find('/') != std::string::npos;
    const bool found = isPath ? g_file_test(command.c_str(), G_FILE_TEST_EXISTS) != FALSE
                              : GlibPtr<char>(g_find_program_in_path(command.c_str())) != nullptr;
    g_printerr("%s: %s: %s\n", m_program.c_str(), command.c_str(),
               found ? "cannot be run" : "command not found");
    return found ? notExecutable : notFound;
}

/// Ends what the command left running, and the services that the buses started.
void Session::endOrphans() const {
    std::ifstream children("/proc/self/task/" + std::to_string(getpid()) + "/children");
    pid_t child = 0;
    while (children >> child) {
        const bool isHelper = std::any_of(m_helpers.begin(), m_helpers.end(),
                                          [&](const auto& h) { return h->pid() == child; });
        if (!isHelper)
            endProcess(child);
    }
}

} // namespace Bluetooth::Serving
