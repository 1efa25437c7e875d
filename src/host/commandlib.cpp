#include <bluetooth/commandlib.h>

#include "core/log.h"
#include "core/process.h"
#include "host/process_lookup.h"

#include <bluetooth/bluetooth.h>
#include <bluetooth/hci.h>
#include <bluetooth/hci_lib.h>
#include <glob.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <cstring>

namespace Bluetooth {

namespace {

constexpr const char* PROCESSES = "/proc/";
constexpr const char* DAEMON_NAME = "bluetoothd";
constexpr const char* DAEMON_PROGRAM = "/usr/sbin/bluetoothd";
constexpr const char* ADAPTER_MARKERS = "/tmp/bluetooth.info_*";
constexpr unsigned int SECONDS_AFTER_KILL = 1;
constexpr std::size_t MAX_LINK = 4096;

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
    char target[MAX_LINK] = {};
    return readlink(link, target, sizeof(target) - 1) >= 0 && strstr(target, name);
}

/// The number in "/proc/PID/exe"; -1 for "/proc/self/exe".
int pidOf(const char* link) {
    const char* const digits = link + strlen(PROCESSES);
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
    const int running = getPidFromName(DAEMON_NAME);
    if (!Matches(ADAPTER_MARKERS).found()) {
        logError(KES_HERE, "No dongle. Stop restarting bluetoothd...");
        return -1;
    }
    if (running >= 0) {
        kill(running, SIGKILL);
        sleepFully(SECONDS_AFTER_KILL);
    }
    // Its status does not matter: what counts is whether the daemon runs.
    runProcess(DAEMON_PROGRAM, {});
    if (getPidFromName(DAEMON_NAME) < 0) {
        logError(KES_HERE, "Failed to start bluetoothd");
        return -1;
    }
    return 0;
}

char* getAddressFromPath(const char* path) {
    static constexpr char PREFIX[] = "dev_";
    const char* const device = path ? strstr(path, PREFIX) : nullptr;
    char* const address = device ? strdup(device + sizeof(PREFIX) - 1) : nullptr;
    if (address)
        std::replace(address, address + strlen(address), '_', ':');
    return address;
}

int getNameFromAddr(const char* address, char* name, int size, GetNameTimeout timeout) {
    if (!name || size < 1 || !address)
        return -1;
    bdaddr_t remote;
    if (str2ba(address, &remote) != 0)
        return -1;
    const int adapter = hci_get_route(&remote);
    if (adapter < 0)
        return -1;
    const int device = hci_open_dev(adapter);
    if (device < 0)
        return -1;

    char found[HCI_MAX_NAME_LENGTH] = {};
    const int result =
        hci_read_remote_name(device, &remote, static_cast<int>(sizeof(found)), found, timeout);
    hci_close_dev(device);
    if (result < 0)
        return -1;

    // A name of the full length comes without a terminator.
    const std::size_t length =
        std::min(strnlen(found, sizeof(found)), static_cast<std::size_t>(size) - 1);
    memcpy(name, found, length);
    name[length] = '\0';
    return 0;
}

} // namespace Bluetooth
