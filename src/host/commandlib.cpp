// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/commandlib.h>

#include "bluez/device_address.h"
#include "core/log.h"
#include "core/process.h"
#include "host/process_lookup.h"

#include <glob.h>
#include <signal.h>
#include <unistd.h>

#include <charconv>
#include <cstdlib>
#include <cstring>
#include <optional>

namespace Bluetooth {

namespace {

constexpr const char* processes = "/proc/";
constexpr const char* daemonName = "bluetoothd";
constexpr const char* daemonProgram = "/usr/sbin/bluetoothd";
constexpr const char* adapterMarkers = "/tmp/bluetooth.info_*";
constexpr unsigned int secondsAfterKill = 1;
constexpr std::size_t maxLink = 4096;

/// The paths that match a pattern, sorted as text.
class Matches {
public:
    explicit Matches(const char* pattern) : m_found(glob(pattern, 0, nullptr, &m_glob) == 0) {}
    Matches(const Matches&) = delete;
    Matches& operator=(const Matches&) = delete;
    ~Matches() { globfree(&m_glob); }

    /// Whether there is at least one.
    bool found() const { return m_found; }
    char** begin() const { return m_glob.gl_pathv; }
    char** end() const { return m_glob.gl_pathv + m_glob.gl_pathc; }

private:
    glob_t m_glob{};
    bool m_found;
};

bool linkContains(const char* link, const char* name) {
    char target[maxLink] = {};
    return readlink(link, target, sizeof(target) - 1) >= 0 && strstr(target, name);
}

/// The number in "/proc/PID/exe"; -1 for "/proc/self/exe".
int pidOf(const char* link) {
    const char* const digits = link + strlen(processes);
    int pid = -1;
    std::from_chars(digits, digits + strlen(digits), pid);
    return pid;
}

void sleepFully(unsigned int seconds) {
    while (seconds > 0)
        seconds = sleep(seconds); // what is left, when a signal came
}

} // namespace

int getPidFromName(const char* name) {
    const Matches links("/proc/*/exe");
    if (!links.found()) {
        logError(KES_HERE, "Failed to get glob info.");
        return -1;
    }
    for (const char* link : links) {
        const int pid = pidOf(link);
        if (pid >= 0 && linkContains(link, name))
            return pid;
    }
    return -1;
}

int restartBluetoothd() {
    const int running = getPidFromName(daemonName);
    if (!Matches(adapterMarkers).found()) {
        logError(KES_HERE, "No dongle. Stop restarting bluetoothd...");
        return -1;
    }
    if (running >= 0) {
        kill(running, SIGKILL);
        sleepFully(secondsAfterKill);
    }
    // Its status does not matter: what counts is whether the daemon runs.
    runProcess(daemonProgram, {});
    if (getPidFromName(daemonName) < 0) {
        logError(KES_HERE, "Failed to start bluetoothd");
        return -1;
    }
    return 0;
}

char* getAddressFromPath(const char* path) try {
    const auto address = path ? addressInPath(path) : std::nullopt;
    return address ? strdup(address->c_str()) : nullptr;
} catch (const std::bad_alloc&) {
    return nullptr;
}

} // namespace Bluetooth
