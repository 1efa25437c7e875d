// SPDX-License-Identifier: LGPL-2.1-or-later
#include "lists.h"

#include "shown_text.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>

#include <sys/stat.h>
#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>

namespace AutoConnectd {

namespace {

using Bluetooth::Adapter;
using Bluetooth::AutoConnect;
using Entries = std::vector<std::string>;

constexpr const char* folder = "/etc/bluetooth/autoconnect/";

/// The address of an adapter whose list counts; "" for one that is off, or does not answer.
std::string addressInUse(Adapter& adapter) {
    const std::unique_ptr<Bluetooth::Dict> properties(adapter.getProperties());
    return Bluetooth::find(properties.get(), "Powered") == "1"
               ? Bluetooth::find(properties.get(), "Address")
               : "";
}

/// Why a list is not used, with what to do; "" when it is.
std::string problemOf(const AutoConnect& files, const std::string& adapter) {
    const std::string path = folder + adapter;
    AutoConnect::List list;
    if (!files.checkConfigFile(path.c_str())) {
        struct stat status {};
        return stat(path.c_str(), &status) == 0
                   ? "make it a regular file that may be read and written here"
                   : std::string("it cannot be made: ") + strerror(errno);
    }
    if (files.readList(adapter.c_str(), list))
        return "";
    return std::string("it cannot be read: ") + strerror(errno);
}

/// Whether the daemon says so; it may as well be away.
bool isUnknown(Adapter& adapter, const std::string& entry) {
    const std::unique_ptr<Bluetooth::Device> device(adapter.findDevice(entry.c_str(), false));
    const std::string error = adapter.getErrorName();
    return !device && (error.empty() || error == "org.bluez.Error.DoesNotExist" ||
                       error == "org.bluez.Error.InvalidArguments");
}

} // namespace

std::unique_ptr<Bluetooth::DeviceList> Lists::read(Bluetooth::AdapterList* adapters) {
    std::map<Adapter*, std::pair<std::string, Entries>> before;
    if (adapters) {
        for (Adapter* adapter : *adapters) {
            const std::string address = adapter ? addressInUse(*adapter) : "";
            if (!address.empty())
                before[adapter] = {address, entriesOf(address)};
        }
    }
    m_havePruned = false;
    std::unique_ptr<Bluetooth::DeviceList> devices(m_files.getAutoConnectDeviceList());
    if (!devices)
        return nullptr;
    for (const auto& [adapter, list] : before) {
        noteProblem(list.first);
        notePruned(*adapter, list.first, list.second);
    }
    return devices;
}

Entries Lists::entriesOf(const std::string& adapter) const {
    AutoConnect::List list;
    m_files.readList(adapter.c_str(), list);
    return list.devices;
}

void Lists::noteProblem(const std::string& adapter) {
    const std::string problem = problemOf(m_files, adapter);
    std::string& logged = m_problems[adapter];
    if (problem != logged && !problem.empty())
        syslog(LOG_WARNING, "the list %s%s is not used: %s", folder, adapter.c_str(),
               problem.c_str());
    logged = problem;
}

void Lists::notePruned(Adapter& adapter, const std::string& address, const Entries& before) {
    const Entries after = entriesOf(address);
    for (const std::string& entry : std::set<std::string>(before.begin(), before.end())) {
        if (std::count(after.begin(), after.end(), entry) > 0 || !isUnknown(adapter, entry))
            continue;
        m_havePruned = true;
        syslog(LOG_WARNING,
               "removed \"%s\" from the list of %s, which does not know it; pair it, then add it",
               shownText(entry).c_str(), address.c_str());
    }
}

} // namespace AutoConnectd
