// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/auto_connect.h>

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/commandlib.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include "core/log.h"
#include "host/auto_connect_file.h"
#include "host/device_lookup.h"
#include "host/pid_file.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth {

namespace {

constexpr mode_t folderMode = 0755;

/// @return false, logged for the caller, when an argument is null
bool isGiven(LogPlace place, const char* argument, const char* name) {
    if (!argument)
        logError(place, "%s is null.", name);
    return argument;
}

bool createConfigFile(const char* path) {
    if (mkdir(autoConnectFolder, folderMode) != 0 && errno != EEXIST) {
        logError(KES_HERE, "Can not create config path '%s'", autoConnectFolder);
        return false;
    }
    std::ofstream file(path, std::ios::binary);
    if (!file) {
        logError(KES_HERE, "Config '%s' can not be open.", path);
        return false;
    }
    if (!writeAutoConnectFile(file, "0")) {
        logError(KES_HERE, "Config '%s' can not be written.", path);
        return false;
    }
    return true;
}

/// AutoConnect::set() for a list that may hold any byte.
bool rewrite(const AutoConnect& config, const char* adapter, bool enable, const std::string& list) {
    const std::string path = autoConnectPath(adapter);
    if (!config.checkConfigFile(path.c_str()))
        return false;
    std::ofstream file(path, std::ios::binary);
    if (!file) {
        logError(KES_HERE, "Can not open config file '%s'.", path.c_str());
        return false;
    }
    if (!writeAutoConnectFile(file, (enable ? '1' : '0') + list)) {
        logError(KES_HERE, "Can not write config file '%s'.", path.c_str());
        return false;
    }
    config.reload();
    return true;
}

bool isReadable(AutoConnectFile& file, const std::string& path) {
    if (file.isTooLarge()) {
        logError(KES_HERE, "Config '%s' is too large.", path.c_str());
        return false;
    }
    return true;
}

/// Opens an adapter's file, creating it where it is missing.
/// @return null when that cannot be done (logged, the opening for the caller)
std::unique_ptr<AutoConnectFile> openFile(LogPlace place, const AutoConnect& config,
                                          const std::string& path, std::ios::openmode mode) {
    if (!config.checkConfigFile(path.c_str()))
        return nullptr;
    auto file = std::make_unique<AutoConnectFile>(path, mode);
    if (file->isOpen())
        return file;
    logError(place, "Cannot open config file '%s'", path.c_str());
    return nullptr;
}

std::vector<std::string> readEntries(AutoConnectFile& file, const std::string& path) {
    std::vector<std::string> entries = file.readEntries();
    if (!file.isComplete())
        logError(KES_HERE, "Config '%s' can not be read to its end.", path.c_str());
    return entries;
}

/// AutoConnect::removeDevice() for an entry that may hold any byte.
bool removeEntry(const AutoConnect& config, const char* adapter, const std::string& device) {
    const std::string path = autoConnectPath(adapter);
    const auto file = openFile(KES_HERE, config, path, std::ios::in | std::ios::out);
    if (!file || !isReadable(*file, path))
        return false;
    // The list of a disabled adapter is left alone on purpose.
    if (!file->readsEnabled())
        return true;
    const std::vector<std::string> entries = readEntries(*file, path);
    if (!file->isComplete())
        return false;
    // Callers learn that the file was processed, not whether it could be rewritten.
    rewrite(config, adapter, true, listWithout(entries, device));
    return true;
}

/// Appends the devices of a file's entries, in the file's order, and removes the entries that the
/// adapter does not know from the file.
void appendAndPrune(const AutoConnect& config, const char* address, Adapter& adapter,
                    const std::vector<std::string>& entries, DeviceList& devices) {
    std::vector<std::string> unknown;
    for (const std::string& entry : entries) {
        if (entry.find('\0') != std::string::npos)
            logError(KES_HERE, "An entry of the config file holds a NUL byte.");
        if (appendDevice(adapter, entry, devices) == Lookup::Unknown)
            unknown.push_back(entry);
    }
    for (const std::string& entry : unknown)
        removeEntry(config, address, entry);
}

/// One adapter's part of AutoConnect::getAutoConnectDeviceList().
void appendTargets(const AutoConnect& config, Adapter& adapter, DeviceList& devices) {
    const std::unique_ptr<Dict> properties(adapter.getProperties());
    const std::string address = find(properties.get(), "Address");
    if (find(properties.get(), "Powered") != "1")
        return;
    const std::string path = autoConnectPath(address.c_str());
    auto file = openFile(KES_HERE, config, path, std::ios::in);
    if (!file || !isReadable(*file, path) || !file->readsEnabled())
        return;
    const std::vector<std::string> entries = readEntries(*file, path);
    file.reset();
    appendAndPrune(config, address.c_str(), adapter, entries, devices);
}

void logFailure(PidFileFailure failure, const char* path, bool reportLocked) {
    switch (failure) {
    case PidFileFailure::Open:
        logError(KES_HERE, "Could not open PID file %s", path);
        break;
    case PidFileFailure::GetFlags:
        logError(KES_HERE, "Can not get flags for PID file %s", path);
        break;
    case PidFileFailure::SetFlags:
        logError(KES_HERE, "Could not set flags for PID file '%s'", path);
        break;
    case PidFileFailure::LockedByOther:
        if (reportLocked)
            logError(KES_HERE, "PID file '%s' is locked; Daemon is already running", path);
        break;
    case PidFileFailure::Lock:
        logError(KES_HERE, "Unable to lock PID file '%s'", path);
        break;
    case PidFileFailure::Truncate:
        logError(KES_HERE, "Could not truncate PID file '%s'", path);
        break;
    case PidFileFailure::Write:
        // Reads like a note of progress; it is the failure's message, and is kept as it is.
        logError(KES_HERE, "Writing to PID file '%s'", path);
        break;
    }
}

} // namespace

bool AutoConnect::checkConfigFile(const char* path) const {
    if (!path) {
        logError(KES_HERE, "Config '%s' can not be open.", "(null)");
        return false;
    }
    struct stat status {};
    if (stat(path, &status) != 0)
        return createConfigFile(path);
    if (!S_ISREG(status.st_mode)) {
        logError(KES_HERE, "Config '%s' is not regular file.", path);
        return false;
    }
    if (access(path, R_OK | W_OK) != 0) {
        logError(KES_HERE, "Config '%s' can not be write/read.", path);
        return false;
    }
    return true;
}

bool AutoConnect::getEnable(const char* adapter) const {
    if (!isGiven(KES_HERE, adapter, "Adapter address"))
        return false;
    const std::string path = autoConnectPath(adapter);
    if (!checkConfigFile(path.c_str()))
        return false;
    AutoConnectFile file(path, std::ios::in);
    return file.isOpen() && isReadable(file, path) && file.readsNonZero();
}

bool AutoConnect::set(const char* adapter, bool enable, const char* deviceList) {
    if (!isGiven(KES_HERE, adapter, "Adapter address") ||
        !isGiven(KES_HERE, deviceList, "Device address list"))
        return false;
    return rewrite(*this, adapter, enable, deviceList);
}

bool AutoConnect::removeDevice(const char* adapter, const char* device) {
    if (!isGiven(KES_HERE, adapter, "Adapter address") ||
        !isGiven(KES_HERE, device, "Device address"))
        return false;
    return removeEntry(*this, adapter, device);
}

DeviceList* AutoConnect::getDeviceList(const char* adapter) {
    if (!isGiven(KES_HERE, adapter, "Adapter address"))
        return nullptr;
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager) {
        logError(KES_HERE, "Failed to get manager.");
        return nullptr;
    }
    const std::unique_ptr<Adapter> proxy(manager->findAdapter(adapter));
    if (!proxy) {
        logError(KES_HERE, "Failed to get adapter.");
        return nullptr;
    }
    const std::string path = autoConnectPath(adapter);
    auto file = openFile(KES_HERE, *this, path, std::ios::in);
    if (!file)
        return nullptr;
    auto devices = std::make_unique<DeviceList>();
    if (!isReadable(*file, path))
        return devices.release();
    const std::vector<std::string> entries = readEntries(*file, path);
    file.reset();
    appendAndPrune(*this, adapter, *proxy, entries, *devices);
    return devices.release();
}

DeviceList* AutoConnect::getAutoConnectDeviceList() {
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager) {
        logError(KES_HERE, "Failed to get manager.");
        return nullptr;
    }
    const std::unique_ptr<AdapterList> adapters(manager->listAdapters());
    if (!adapters) {
        logError(KES_HERE, "Failed to get adapter list");
        return nullptr;
    }
    auto devices = std::make_unique<DeviceList>();
    for (Adapter* adapter : *adapters) {
        if (adapter) // null: the daemon left the bus while the list was made
            appendTargets(*this, *adapter, *devices);
    }
    return devices.release();
}

// Readers of the log know the lines of this function under this file's name.
int createPidFile(const char* path, int flags, bool reportLocked) {
    PidFileFailure failure{};
    const int descriptor = lockPidFile(path, flags, failure);
    if (descriptor >= 0)
        return descriptor;
    const int error = errno;
    logFailure(failure, path ? path : "(null)", reportLocked);
    errno = error;
    return -1;
}

} // namespace Bluetooth
