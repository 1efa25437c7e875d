#include "run/session.h"

#include "run/private_bus.h"
#include "run/process.h"
#include "world/scenario.h"

#include <glib-unix.h>
#include <glib/gstdio.h>

#include <algorithm>
#include <csignal>
#include <fstream>
#include <memory>
#include <stdexcept>

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Bluetooth::Sim {

namespace {

constexpr int notFound = 127;
constexpr int notExecutable = 126;

/// A folder that goes with all that is in it.
class TemporaryFolder {
public:
    TemporaryFolder() {
        ErrorOut error;
        const GlibPtr<char> made(g_dir_make_tmp("bluez4-sim-XXXXXX", error.out()));
        if (!made)
            throw std::runtime_error(error->message);
        m_path = made.get();
    }
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;
    ~TemporaryFolder() {
        if (GDir* dir = g_dir_open(m_path.c_str(), 0, nullptr)) {
            while (const char* name = g_dir_read_name(dir))
                g_unlink((m_path + "/" + name).c_str());
            g_dir_close(dir);
        }
        g_rmdir(m_path.c_str());
    }
    const std::string& path() const { return m_path; }

private:
    std::string m_path;
};

std::string ownProgram() {
    ErrorOut error;
    const GlibPtr<char> path(g_file_read_link("/proc/self/exe", error.out()));
    if (!path)
        throw std::runtime_error(error->message);
    return path.get();
}

/// The service files that were installed with this program, after those that were named.
std::vector<std::string> serviceFolders(const Options& options) {
    std::vector<std::string> folders = options.sessionServices;
    const GlibPtr<char> bin(g_path_get_dirname(ownProgram().c_str()));
    const GlibPtr<char> prefix(g_path_get_dirname(bin.get()));
    const std::string installed = std::string(prefix.get()) + "/share/dbus-1/services";
    if (g_file_test(installed.c_str(), G_FILE_TEST_IS_DIR))
        folders.push_back(installed);
    return folders;
}

/// The daemon in a process of its own, which a test may kill.
class DaemonProcess {
public:
    DaemonProcess(const Options& options, const std::vector<std::string>& environment) {
        constexpr int readyFd = 3;
        char scale[G_ASCII_DTOSTR_BUF_SIZE];
        g_ascii_dtostr(scale, sizeof scale, options.timeScale);
        Helper helper;
        helper.arguments = {ownProgram(), "--ready-fd=" + std::to_string(readyFd),
                            std::string("--time-scale=") + scale};
        if (!options.scenario.empty())
            helper.arguments.push_back("--scenario=" + options.scenario);
        if (options.verbose)
            helper.arguments.emplace_back("--verbose");
        helper.environment = environment;
        helper.pipeTarget = readyFd;
        int output = -1;
        m_pid = startHelper(helper, output);
        if (readLine(output).empty()) {
            endProcess(m_pid);
            throw std::runtime_error("the simulated daemon has not started");
        }
    }
    DaemonProcess(const DaemonProcess&) = delete;
    DaemonProcess& operator=(const DaemonProcess&) = delete;
    ~DaemonProcess() { endProcess(m_pid); }

    pid_t pid() const { return m_pid; }

private:
    pid_t m_pid = 0;
};

/// Ends what the command left running, and the services that the buses started.
/// @param ours  helpers, which stay
void endOrphans(const std::vector<pid_t>& ours) {
    std::ifstream children("/proc/self/task/" + std::to_string(getpid()) + "/children");
    pid_t child = 0;
    while (children >> child) {
        if (std::find(ours.begin(), ours.end(), child) == ours.end())
            endProcess(child);
    }
}

/// Passes the signals that ask us to stop on to the command, so that it ends first and we clean up.
class SignalRelay {
public:
    SignalRelay() {
        add<SIGTERM>();
        add<SIGINT>();
        add<SIGHUP>();
    }
    SignalRelay(const SignalRelay&) = delete;
    SignalRelay& operator=(const SignalRelay&) = delete;
    ~SignalRelay() {
        for (const guint source : m_sources)
            g_source_remove(source);
    }

    void setTarget(pid_t pid) { m_target = pid; }
    /// The signal that came before there was a command, or 0.
    int early() const {
        while (g_main_context_iteration(nullptr, FALSE)) {
        }
        return m_early;
    }

private:
    template <int Signal>
    void add() {
        const auto came = [](gpointer data) -> gboolean {
            static_cast<SignalRelay*>(data)->came(Signal);
            return G_SOURCE_CONTINUE;
        };
        m_sources.push_back(g_unix_signal_add(Signal, came, this));
    }

    void came(int signal) {
        // Ctrl-C on a terminal has reached the command already.
        const bool fromTerminal = signal == SIGINT && tcgetpgrp(STDIN_FILENO) == getpgrp();
        if (!m_target)
            m_early = signal;
        else if (!fromTerminal)
            kill(m_target, signal);
    }

    std::vector<guint> m_sources;
    pid_t m_target = 0;
    int m_early = 0;
};

struct Running {
    GMainLoop* loop;
    pid_t pid;
    int status;
};

int exitStatus(int status) {
    return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
}

/// @return the status that a shell gives for it
int cannotRun(const std::string& program) {
    const bool isPath = program.find('/') != std::string::npos;
    const bool found = isPath ? g_file_test(program.c_str(), G_FILE_TEST_EXISTS) != FALSE
                              : GlibPtr<char>(g_find_program_in_path(program.c_str())) != nullptr;
    g_printerr("bluez4-sim: %s: %s\n", program.c_str(),
               found ? "cannot be run" : "command not found");
    return found ? notExecutable : notFound;
}

int runCommand(const std::vector<std::string>& command, const std::vector<std::string>& environment,
               SignalRelay& relay) {
    if (const int signal = relay.early())
        return 128 + signal;
    auto arguments = cStrings(command);
    auto variables = cStrings(environment);
    Running running{g_main_loop_new(nullptr, FALSE), 0, 0};
    ErrorOut error;
    const auto flags =
        static_cast<GSpawnFlags>(G_SPAWN_DO_NOT_REAP_CHILD | G_SPAWN_SEARCH_PATH |
                                 G_SPAWN_CHILD_INHERITS_STDIN | G_SPAWN_LEAVE_DESCRIPTORS_OPEN);
    if (!g_spawn_async(nullptr, arguments.data(), variables.data(), flags, nullptr, nullptr,
                       &running.pid, error.out())) {
        g_main_loop_unref(running.loop);
        return cannotRun(command.front());
    }
    relay.setTarget(running.pid);
    g_child_watch_add(
        running.pid,
        [](GPid, gint status, gpointer data) {
            auto* ended = static_cast<Running*>(data);
            ended->status = status;
            g_main_loop_quit(ended->loop);
        },
        &running);
    g_main_loop_run(running.loop);
    relay.setTarget(0);
    g_main_loop_unref(running.loop);
    return exitStatus(running.status);
}

} // namespace

int runSession(const Options& options) {
    if (!options.noDaemon && !options.scenario.empty())
        loadScenario(options.scenario); // a wrong one is told before anything is started
    // Whoever loses its parent in here becomes our child, so that nothing outlives the session.
    prctl(PR_SET_CHILD_SUBREAPER, 1);
    SignalRelay relay;
    const TemporaryFolder folder;
    const auto plain = environmentWith({"DBUS_SYSTEM_BUS_ADDRESS", "DBUS_SESSION_BUS_ADDRESS",
                                        "DBUS_STARTER_ADDRESS", "DBUS_STARTER_BUS_TYPE"});
    int status = 0;
    {
        const PrivateBus system(folder.path(), "system", {}, plain);
        const auto forServices = environmentWith({"DBUS_SYSTEM_BUS_ADDRESS=" + system.address(),
                                                  "DBUS_SESSION_BUS_ADDRESS",
                                                  "DBUS_STARTER_ADDRESS", "DBUS_STARTER_BUS_TYPE"});
        std::unique_ptr<DaemonProcess> daemon;
        if (!options.noDaemon)
            daemon = std::make_unique<DaemonProcess>(options, forServices);
        const PrivateBus session(folder.path(), "session", serviceFolders(options), forServices);
        const auto forCommand = environmentWith({"DBUS_SYSTEM_BUS_ADDRESS=" + system.address(),
                                                 "DBUS_SESSION_BUS_ADDRESS=" + session.address(),
                                                 "DBUS_STARTER_ADDRESS", "DBUS_STARTER_BUS_TYPE"});
        status = runCommand(options.command, forCommand, relay);
        // Before the buses, whose loss they would report.
        endOrphans({system.pid(), session.pid(), daemon ? daemon->pid() : 0});
    }
    endOrphans({}); // started meanwhile
    return status;
}

} // namespace Bluetooth::Sim
