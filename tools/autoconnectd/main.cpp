// SPDX-License-Identifier: LGPL-2.1-or-later
#include "auto_connector.h"
#include "background.h"
#include "command_pipe.h"
#include "main_loop.h"
#include "wakeup.h"

#include "common/daemon_program.h"
#include "common/stop_request.h"

#include <bluetooth/commandlib.h>
#include <bluetooth/connection.h>

#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>

namespace AutoConnectd {

namespace {

using Tools::DaemonProgram;

constexpr const char* pipePath = "/tmp/kes_bluetooth_autoconnect";
constexpr int closeOnExec = 1;    // of createPidFile()
constexpr int day = 24 * 60 * 60; // s

struct StartOptions {
    bool foreground = false;
    bool verbose = false;
    std::string pidFile = "/run/kesbt-autoconnectd.pid";
    int interval = 10;     // s
    int maxInterval = 120; // s
};

void addOptions(CLI::App& commandLine, StartOptions& options) {
    commandLine.add_flag("-f,--foreground", options.foreground,
                         "Stay in the foreground, log to standard error too");
    commandLine.add_flag("-v,--verbose", options.verbose,
                         "Log calls that fail too, to report a fault");
    commandLine.add_option("--pid-file", options.pidFile, "PID file and lock of the only instance")
        ->capture_default_str();
    commandLine
        .add_option("--interval", options.interval,
                    "Seconds to the second attempt at a device that is\naway; doubles each time")
        ->capture_default_str()
        ->check(CLI::Range(1, day));
    commandLine
        .add_option("--max-interval", options.maxInterval, "Longest time between two attempts")
        ->capture_default_str()
        ->check(CLI::Range(1, day));
}

void settle(StartOptions& options) {
    // The background's current folder is another one.
    std::error_code error;
    const auto absolute = std::filesystem::absolute(options.pidFile, error);
    if (!options.pidFile.empty() && !error)
        options.pidFile = absolute;
    options.maxInterval = std::max(options.maxInterval, options.interval);
}

std::string pidFileProblem(const std::string& path, int error) {
    if (error == EAGAIN)
        return "already running (" + path +
               " is locked); stop the other one, or choose another file with --pid-file";
    if (error == ELOOP)
        return path + " is a link; remove it, or choose another file with --pid-file";
    return "cannot write " + path + ": " + strerror(error) +
           "; run as root, or choose another file with --pid-file";
}

/// The library logs each call that fails, for programmers. What a person can act on the daemon logs
/// itself, on every priority but the library's.
void keepLibraryQuiet() {
    setlogmask(LOG_UPTO(LOG_DEBUG) & ~LOG_MASK(LOG_ERR));
}

int work(const DaemonProgram& program, const StartOptions& options) {
    if (!options.verbose)
        keepLibraryQuiet();
    Background background;
    if (!options.foreground && !background.enter())
        return program.fail(std::string("cannot go into the background: ") + strerror(errno));
    if (Bluetooth::createPidFile(options.pidFile.c_str(), closeOnExec, true) < 0)
        return program.fail(pidFileProblem(options.pidFile, errno));
    std::string problem;
    auto pipe = CommandPipe::open(pipePath, problem);
    if (!pipe)
        return program.fail(problem);
    if (!openWakeup() || !Tools::stopOnSignals())
        return program.fail(std::string("cannot make an event descriptor: ") + strerror(errno));
    // Anyone on the bus may send signals that look like bluetoothd's.
    Bluetooth::Connection::checkSenders(true);
    AutoConnector connector(
        {std::chrono::seconds(options.interval), std::chrono::seconds(options.maxInterval)});
    if (!connector.start())
        return program.fail("cannot reach the system bus; start dbus-daemon, or set "
                            "DBUS_SYSTEM_BUS_ADDRESS");
    background.ready();
    if (options.foreground) // not before: a failed start is told in one line
        openlog(program.name(), LOG_PID | LOG_PERROR, LOG_DAEMON);
    syslog(LOG_NOTICE, "started");
    return MainLoop(connector, std::move(pipe)).run();
}

} // namespace

} // namespace AutoConnectd

int main(int argc, char** argv) {
    Tools::DaemonProgram program("kesbt-autoconnectd",
                                 "Connects the Bluetooth devices of the auto-connect files\n"
                                 "(/etc/bluetooth/autoconnect/) and keeps them connected.");
    AutoConnectd::StartOptions options;
    AutoConnectd::addOptions(program.commandLine(), options);
    if (const auto status = program.start(argc, argv))
        return *status;
    AutoConnectd::settle(options);
    return AutoConnectd::work(program, options);
}
