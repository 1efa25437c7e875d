// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/auto_connect.h>

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/commandlib.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include "core/descriptor.h"
#include "core/log.h"
#include "host/auto_connect_file.h"
#include "host/auto_connect_lock.h"
#include "host/device_lookup.h"
#include "host/file_place.h"
#include "host/file_replacement.h"
#include "host/pid_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth {

namespace {

constexpr mode_t folderMode = 0755;
constexpr mode_t fileMode = 0664; // less the umask, and never writable for everybody

/// @return false, logged for the caller, when an argument is null
bool isGiven(LogPlace place, const char* argument, const char* name) {
    if (!argument)
        logError(place, "%s is null.", name);
    return argument;
}

/// Another program may do the same: what it has written meanwhile stays.
bool createConfigFile(const char* path) {
    if (mkdir(autoConnectFolder, folderMode) != 0 && errno != EEXIST) {
        logError(KES_HERE, "Can not create config path '%s'", autoConnectFolder);
        return false;
    }
    // Another user's link would choose which file is made.
    const auto place = findPlace(path, true);
    constexpr int flags = O_WRONLY | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
    const Descriptor file(
        place ? openat(place->folder->number(), place->name.c_str(), flags, fileMode) : -1);
    struct stat status {};
    if (!file.isOpen() || fstat(file.number(), &status) != 0) {
        logError(KES_HERE, "Config '%s' can not be open.", path);
        return false;
    }
    if (status.st_size == 0 && write(file.number(), "0", 1) != 1) {
        logError(KES_HERE, "Config '%s' can not be written.", path);
        return false;
    }
    return true;
}

/// The last step of each change.
bool replaceList(const std::string& path, const std::string& content, const AutoConnectLock& lock) {
    switch (replaceFile(path, content, lock.isHeld())) {
    case Replacement::Done:
        return true;
    case Replacement::NotOpened:
        logError(KES_HERE, "Can not open config file '%s'.", path.c_str());
        return false;
    case Replacement::NotWritten:
        logError(KES_HERE, "Can not write config file '%s'.", path.c_str());
        return false;
    }
    return false;
}

bool isReadable(const AutoConnectFile& file, const std::string& path) {
    if (file.isTooLarge()) {
        logError(KES_HERE, "Config '%s' is too large.", path.c_str());
        return false;
    }
    return true;
}

/// Reads an adapter's file, which is created where it is missing.
/// @param access as for AutoConnectFile
/// @return null when that cannot be done (logged, the opening for the caller)
std::unique_ptr<AutoConnectFile> openFile(LogPlace place, const AutoConnect& config,
                                          const std::string& path, int access) {
    if (!config.checkConfigFile(path.c_str()))
        return nullptr;
    auto file = std::make_unique<AutoConnectFile>(path, access);
    if (file->isOpen())
        return file;
    logError(place, "Cannot open config file '%s'", path.c_str());
    return nullptr;
}

std::vector<std::string> readEntries(const AutoConnectFile& file, const std::string& path) {
    if (!file.isComplete())
        logError(KES_HERE, "Config '%s' can not be read to its end.", path.c_str());
    return file.entries();
}

enum class Change { NotRead, Disabled, NotWritten, Done };

/// Changes a list as AutoConnect::changeList() does.
/// @param onlyEnabled whether the list of a disabled adapter is left alone
Change changeFile(const AutoConnect& config, const char* adapter, bool onlyEnabled,
                  const std::function<void(AutoConnect::List&)>& change) {
    const std::string path = autoConnectPath(adapter);
    if (!config.checkConfigFile(path.c_str())) // makes the folder of the lock
        return Change::NotRead;
    {
        const AutoConnectLock lock;
        const auto file = openFile(KES_HERE, config, path, O_RDWR);
        if (!file || !isReadable(*file, path))
            return Change::NotRead;
        if (onlyEnabled && !file->readsEnabled())
            return Change::Disabled;
        AutoConnect::List list{file->readsNonZero(), readEntries(*file, path)};
        if (!file->isComplete())
            return Change::NotRead;
        change(list);
        if (!replaceList(path, contentOf(list), lock))
            return Change::NotWritten;
    }
    config.reload();
    return Change::Done;
}

/// AutoConnect::removeDevice() for an entry that may hold any byte.
/// @param isListed receives whether it was there
Change removeEntry(const AutoConnect& config, const char* adapter, const std::string& device,
                   bool& isListed) {
    return changeFile(config, adapter, true, [&](AutoConnect::List& list) {
        const auto kept = std::remove(list.devices.begin(), list.devices.end(), device);
        isListed = kept != list.devices.end();
        list.devices.erase(kept, list.devices.end());
    });
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
    for (const std::string& entry : unknown) {
        bool isListed = false;
        if (removeEntry(config, address, entry, isListed) == Change::Done && isListed)
            logError(KES_HERE, "Removed '%s' from the list of %s, which does not know it.",
                     shownEntry(entry).c_str(), address);
    }
}

/// One adapter's part of AutoConnect::getAutoConnectDeviceList().
void appendTargets(const AutoConnect& config, Adapter& adapter, DeviceList& devices) {
    const std::unique_ptr<Dict> properties(adapter.getProperties());
    const std::string address = find(properties.get(), "Address");
    if (find(properties.get(), "Powered") != "1")
        return;
    const std::string path = autoConnectPath(address.c_str());
    const auto file = openFile(KES_HERE, config, path, O_RDONLY);
    if (file && isReadable(*file, path) && file->readsEnabled())
        appendAndPrune(config, address.c_str(), adapter, readEntries(*file, path), devices);
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
    const AutoConnectFile file(path, O_RDONLY);
    return file.isOpen() && isReadable(file, path) && file.readsNonZero();
}

bool AutoConnect::set(const char* adapter, bool enable, const char* deviceList) {
    if (!isGiven(KES_HERE, adapter, "Adapter address") ||
        !isGiven(KES_HERE, deviceList, "Device address list"))
        return false;
    const std::string path = autoConnectPath(adapter);
    if (!checkConfigFile(path.c_str()) ||
        !replaceList(path, (enable ? '1' : '0') + std::string(deviceList), AutoConnectLock()))
        return false;
    reload();
    return true;
}

bool AutoConnect::removeDevice(const char* adapter, const char* device) {
    if (!isGiven(KES_HERE, adapter, "Adapter address") ||
        !isGiven(KES_HERE, device, "Device address"))
        return false;
    // Callers learn that the file was processed, not whether it could be rewritten.
    bool isListed = false;
    return removeEntry(*this, adapter, device, isListed) != Change::NotRead;
}

bool AutoConnect::readList(const char* adapter, List& list) const {
    if (!isGiven(KES_HERE, adapter, "Adapter address")) {
        errno = EINVAL;
        return false;
    }
    const std::string path = autoConnectPath(adapter);
    const AutoConnectFile file(path, O_RDONLY);
    if (!file.isOpen() && file.error() != ENOENT)
        logError(KES_HERE, "Cannot open config file '%s'", path.c_str());
    else if (isReadable(file, path))
        list = {file.readsNonZero(), file.isOpen() ? readEntries(file, path) : file.entries()};
    errno = file.error();
    return file.isComplete() || file.error() == ENOENT;
}

bool AutoConnect::changeList(const char* adapter, const std::function<void(List&)>& change) {
    return isGiven(KES_HERE, adapter, "Adapter address") &&
           changeFile(*this, adapter, false, change) == Change::Done;
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
    const auto file = openFile(KES_HERE, *this, path, O_RDONLY);
    if (!file)
        return nullptr;
    auto devices = std::make_unique<DeviceList>();
    if (isReadable(*file, path))
        appendAndPrune(*this, adapter, *proxy, readEntries(*file, path), *devices);
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
