#include <bluetooth/scanner_server.h>

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>
#include <bluetooth/manager.h>

#include "core/log.h"
#include "scanner/finders.h"
#include "scanner/names.h"
#include "scanner/scanner_object_info.h"

#include <algorithm>
#include <atomic>

namespace Bluetooth {

namespace {

using Lock = std::lock_guard<std::mutex>;

std::atomic<ScannerServer*> current{nullptr};

/// @return "00:11:22:33:44:55" for ".../dev_00_11_22_33_44_55"; "" for any other path
std::string addressOf(const std::string& devicePath) {
    const std::string prefix = "dev_";
    const std::size_t place = devicePath.find(prefix);
    if (place == std::string::npos)
        return "";
    std::string address = devicePath.substr(place + prefix.size());
    std::replace(address.begin(), address.end(), '_', ':');
    return address;
}

/// Adds the addresses of the devices that the daemon knows on an adapter.
void addKnownDevices(Adapter& adapter, AddressSet& addresses) {
    const std::unique_ptr<DeviceList> devices(adapter.listDevices());
    if (!devices)
        return;
    for (const Device* device : *devices) {
        std::string address = device ? addressOf(device->getPath()) : "";
        if (!address.empty())
            addresses.insert(std::move(address));
    }
}

} // namespace

ScannerServer* currentServer() {
    return current;
}

ScannerServer::ScannerServer()
    : ServerObject(scannerBusName, scannerPath, DBUS_BUS_SESSION),
      m_scannerObject(
          static_cast<ScannerObject*>(g_object_new(scanner_object_get_type(), nullptr))) {
    const Manager* manager = fetchManager();
    const bool prepared = prepareObjectInfo(scanner_object_get_type(), &scannerObjectInfo(),
                                            &m_scannerObject->parent);
    if (!manager || !prepared)
        logError(KES_HERE, "Failed to initial the ScannerServer");
    updateFilterSet();
    current = this;
}

ScannerServer::~ScannerServer() {
    joinReceiver(); // its callbacks use what is destroyed here
    ScannerServer* self = this;
    current.compare_exchange_strong(self, nullptr); // a handler that comes later finds no server
    takeDiscoveries();
    g_object_unref(m_scannerObject);
}

int ScannerServer::callbackThreadHandler(void*) {
    {
        const Lock lock(m_mutex);
        if (--m_idleCountdown != 0) // below 0 the loop runs on: only reaching 0 ends it
            return 1;
    }
    quitLoop();
    return 0;
}

void ScannerServer::addAdapterFounder(const char* adapterId) {
    const std::unique_ptr<Adapter> adapter = Finders::findAdapter(*this, adapterId);
    if (adapter)
        Finders(*this, *m_scannerObject).add(adapter->getPath());
}

void ScannerServer::updateFilterSet() {
    if (!fetchManager()) {
        logError(KES_HERE, "failed to get manager");
        return;
    }
    AddressSet known;
    Manager manager; // of its own, as in Finders::findAdapter()
    const std::unique_ptr<AdapterList> adapters(manager.listAdapters());
    if (adapters) {
        for (Adapter* adapter : *adapters) {
            if (adapter)
                addKnownDevices(*adapter, known);
        }
    }
    const Lock lock(m_mutex);
    m_filterSet.swap(known);
}

bool ScannerServer::isInFilterSet(const std::string& address) {
    const Lock lock(m_mutex);
    return m_filterSet.count(address) > 0;
}

void ScannerServer::putInfoToMap(const std::string& address, const std::string& text) {
    const Lock lock(m_mutex);
    m_deviceInfo[address] = text;
}

std::string ScannerServer::getInfoFromMap(const std::string& address) {
    const Lock lock(m_mutex);
    return m_deviceInfo[address];
}

void ScannerServer::stopDiscovery() {
    stopReceiving();
    joinReceiver();
    for (const Discovery& discovery : takeDiscoveries())
        discovery.adapter->stopDiscovery();
}

/// Forgets all discoveries and finders. The caller destroys them, which waits for their callbacks.
std::vector<ScannerServer::Discovery> ScannerServer::takeDiscoveries() {
    std::vector<Discovery> discoveries;
    const Lock lock(m_mutex);
    discoveries.swap(m_discoveries);
    m_scannerObject->finders.clear();
    return discoveries;
}

/// The manager, looked for again while there is none. It also runs the receive thread, which begins
/// here when the daemon comes only after the loop.
Manager* ScannerServer::fetchManager() {
    const auto held = [this] {
        const Lock lock(m_mutex);
        return m_manager.get();
    };
    if (!held()) {
        std::unique_ptr<Manager> manager(Manager::getManager());
        if (!manager)
            return nullptr;
        const Lock lock(m_mutex);
        if (!m_manager)
            m_manager.swap(manager);
    }
    startReceiver(); // now, or because it failed before
    return held();
}

/// Starts the receive thread when it is wanted, possible and not done yet.
void ScannerServer::startReceiver() {
    {
        const Lock lock(m_mutex);
        if (!m_receives || !m_manager || m_hasReceiver)
            return;
        m_hasReceiver = true;
    }
    if (m_manager->startLoop() == 0)
        return;
    logError(KES_HERE, "Failed to start the receive thread");
    const Lock lock(m_mutex);
    m_hasReceiver = false;
}

void ScannerServer::startReceiving() {
    joinReceiver(); // of a loop before
    {
        const Lock lock(m_mutex);
        m_receives = true;
    }
    startReceiver();
}

void ScannerServer::stopReceiving() {
    Manager* manager = nullptr;
    {
        const Lock lock(m_mutex);
        m_receives = false;
        manager = m_manager.get();
    }
    if (manager)
        manager->stopLoop();
}

void ScannerServer::joinReceiver() {
    {
        const Lock lock(m_mutex);
        if (!m_hasReceiver)
            return;
        m_hasReceiver = false;
    }
    m_manager->waitLoop();
}

} // namespace Bluetooth
