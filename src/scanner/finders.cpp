#include "scanner/finders.h"

#include <bluetooth/adapter.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>
#include <bluetooth/scanner_server.h>

#include <algorithm>
#include <mutex>

namespace Bluetooth {

namespace {

using Lock = std::lock_guard<std::mutex>;

void onDeviceFound(RemoteObject* sender, const char* address, const Dict* properties) {
    if (ScannerServer* server = currentServer())
        Finders::deviceFound(*server, sender, address, dictConquerToString(*properties, ";"));
}

void onDeviceDisappeared(RemoteObject* sender, const char* address) {
    if (ScannerServer* server = currentServer())
        Finders::deviceDisappeared(*server, sender, address);
}

/// What the daemon knows the adapter by: "hci0" for an object path, which it does not look up.
std::string patternOf(const std::string& adapterId) {
    return adapterId.rfind('/', 0) == 0 ? adapterId.substr(adapterId.rfind('/') + 1) : adapterId;
}

} // namespace

std::unique_ptr<Adapter> Finders::findAdapter(ScannerServer& server, const char* pattern) {
    if (!server.fetchManager())
        return nullptr;
    // A proxy of its own: finders are made on two threads, and a proxy serves one at a time.
    Manager manager;
    return std::unique_ptr<Adapter>(manager.findAdapter(pattern));
}

Finders::Set Finders::add(const std::string& adapterId) {
    const std::shared_ptr<Adapter> adapter = findAdapter(m_server, patternOf(adapterId).c_str());
    if (!adapter)
        return nullptr;
    auto set = std::make_shared<AddressSet>();

    adapter->startDiscovery();
    {
        // Before the subscriptions: what is found at once is to find its finder. After the start:
        // who removes the finder meanwhile stops a discovery that has begun.
        const Lock lock(m_server.m_mutex);
        m_server.m_discoveries.push_back({adapter, set});
        m_object.finders.emplace(adapterId, set);
        m_server.m_idleCountdown = ScannerServer::ticksToLive;
    }
    adapter->setDeviceFoundHandler(onDeviceFound);
    adapter->setDeviceDisappearedHandler(onDeviceDisappeared);
    // The new set even when the adapter had one: what is looked up in it is not found then.
    return set;
}

Finders::Set Finders::of(const std::string& path) {
    {
        const Lock lock(m_server.m_mutex);
        const auto finder = m_object.finders.find(path);
        if (finder != m_object.finders.end())
            return finder->second;
    }
    return add(path);
}

void Finders::remove(Adapter& adapter) {
    const std::string path = adapter.getPath();
    ScannerServer::Discovery removed;
    {
        const Lock lock(m_server.m_mutex);
        auto& discoveries = m_server.m_discoveries;
        const auto first =
            std::find_if(discoveries.begin(), discoveries.end(), [&](const auto& discovery) {
                return discovery.adapter->getPath() == path;
            });
        if (first != discoveries.end()) {
            removed = std::move(*first);
            discoveries.erase(first);
        }
    }
    if (removed.adapter)
        adapter.stopDiscovery();
    // Waits for its callback on the receive thread, which may still make use of the finder.
    removed.adapter.reset();

    Set forgotten;
    const Lock lock(m_server.m_mutex);
    const auto finder = m_object.finders.find(path);
    if (finder != m_object.finders.end()) {
        forgotten = std::move(finder->second);
        m_object.finders.erase(finder);
    }
}

std::vector<std::pair<std::string, std::string>> Finders::unknownDevices(const AddressSet& set) {
    std::vector<std::pair<std::string, std::string>> devices;
    const Lock lock(m_server.m_mutex);
    for (const std::string& address : set) {
        if (m_server.m_filterSet.count(address) == 0)
            devices.emplace_back(address, m_server.m_deviceInfo[address]);
    }
    return devices;
}

/// Whether the proxy belongs to a discovery, and so is an Adapter. One that was taken away may
/// still be called; it must not act any more, nor be looked at while it is being destroyed.
bool Finders::isListening(ScannerServer& server, const RemoteObject* sender) {
    const Lock lock(server.m_mutex);
    const auto& discoveries = server.m_discoveries;
    return std::any_of(discoveries.begin(), discoveries.end(), [sender](const auto& discovery) {
        return discovery.adapter.get() == sender;
    });
}

void Finders::deviceFound(ScannerServer& server, const RemoteObject* sender,
                          const std::string& address, const std::string& text) {
    if (!isListening(server, sender))
        return;
    // A signal makes a finder where there is none any more.
    const Set set = Finders(server, *server.m_scannerObject).of(sender->getPath());
    server.putInfoToMap(address, text);
    if (set) {
        const Lock lock(server.m_mutex);
        set->insert(address);
    }
}

void Finders::deviceDisappeared(ScannerServer& server, const RemoteObject* sender,
                                const std::string& address) {
    if (!isListening(server, sender))
        return;
    const Set set = Finders(server, *server.m_scannerObject).of(sender->getPath());
    if (set) {
        const Lock lock(server.m_mutex);
        set->erase(address); // its text is kept
    }
}

} // namespace Bluetooth
