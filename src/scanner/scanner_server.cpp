// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/scanner_server.h>

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/manager.h>

#include "bluez/device_address.h"
#include "bluez/device_paths.h"
#include "core/log.h"
#include "scanner/finders.h"
#include "scanner/names.h"
#include "scanner/scanner_object_info.h"

#include <atomic>
#include <optional>
#include <utility>

namespace Bluetooth {

namespace {

using Lock = std::lock_guard<std::mutex>;

std::atomic<Finders*> current{nullptr};

/// Adds the addresses of the devices that the daemon knows on an adapter.
void addKnownDevices(Adapter& adapter, AddressSet& addresses) {
    std::vector<ObjectPath> paths;
    readDevicePaths(KES_HERE, adapter,
                    paths); // not listDevices(): each proxy would look for the daemon
    for (const ObjectPath& path : paths) {
        const auto address = addressInPath(path);
        if (address && !address->empty())
            addresses.insert(*address);
    }
}

} // namespace

Finders* currentFinders() {
    return current;
}

ScannerServer::ScannerServer()
    : ServerObject(scannerBusName, scannerPath, DBUS_BUS_SESSION),
      m_scannerObject(
          static_cast<ScannerObject*>(g_object_new(scanner_object_get_type(), nullptr))),
      m_state(std::make_unique<ScannerState>()),
      m_finders(std::make_unique<Finders>(*this, *m_state, *m_scannerObject)) {
    const Manager* manager = fetchManager();
    const bool prepared = prepareObjectInfo(scanner_object_get_type(), &scannerObjectInfo(),
                                            &m_scannerObject->parent);
    if (!manager || !prepared)
        logError(KES_HERE, "Failed to initial the ScannerServer");
    updateFilterSet();
    current = m_finders.get();
}

ScannerServer::~ScannerServer() {
    joinReceiver(); // its callbacks use what is destroyed here
    Finders* own = m_finders.get();
    current.compare_exchange_strong(own, nullptr); // a handler that comes later finds no server
    takeDiscoveries();
    g_object_unref(m_scannerObject);
}

int ScannerServer::callbackThreadHandler(void*) {
    if (!m_state->countDown())
        return 1;
    quitLoop();
    return 0;
}

void ScannerServer::addAdapterFounder(const char* adapterId) {
    const std::unique_ptr<Adapter> adapter = m_finders->findAdapter(adapterId);
    if (adapter)
        m_finders->add(*m_scannerObject, adapter->getPath());
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
    m_state->setFilter(std::move(known));
}

bool ScannerServer::isInFilterSet(const std::string& address) {
    return m_state->isInFilter(address);
}

void ScannerServer::putInfoToMap(const std::string& address, const std::string& text) {
    m_state->putText(address, text);
}

std::string ScannerServer::getInfoFromMap(const std::string& address) {
    return m_state->text(address);
}

void ScannerServer::stopDiscovery() {
    stopReceiving();
    joinReceiver();
    for (const StartedDiscovery& discovery : takeDiscoveries())
        discovery.adapter->stopDiscovery();
}

/// Forgets all discoveries and finders. The caller destroys them, which waits for their callbacks.
std::vector<StartedDiscovery> ScannerServer::takeDiscoveries() {
    return m_state->takeAll(*m_scannerObject);
}

/// The manager, looked for again while there is none. It also runs the receive thread, which begins
/// here when the daemon comes only after the loop.
Manager* ScannerServer::fetchManager() {
    const auto held = [this] {
        const Lock lock(m_receiverMutex);
        return m_manager.get();
    };
    if (!held()) {
        std::unique_ptr<Manager> manager(Manager::getManager());
        if (!manager)
            return nullptr;
        const Lock lock(m_receiverMutex);
        if (!m_manager)
            m_manager.swap(manager);
    }
    startReceiver(); // now, or because it failed before
    return held();
}

/// Starts the receive thread when it is wanted, possible and not done yet.
void ScannerServer::startReceiver() {
    {
        const Lock lock(m_receiverMutex);
        if (!m_receives || !m_manager || m_hasReceiver)
            return;
        m_hasReceiver = true;
    }
    if (m_manager->startLoop() == 0)
        return;
    logError(KES_HERE, "Failed to start the receive thread");
    const Lock lock(m_receiverMutex);
    m_hasReceiver = false;
}

void ScannerServer::startReceiving() {
    joinReceiver(); // of a loop before
    {
        const Lock lock(m_receiverMutex);
        m_receives = true;
    }
    startReceiver();
}

void ScannerServer::stopReceiving() {
    Manager* manager = nullptr;
    {
        const Lock lock(m_receiverMutex);
        m_receives = false;
        manager = m_manager.get();
    }
    if (manager)
        manager->stopLoop();
}

void ScannerServer::joinReceiver() {
    {
        const Lock lock(m_receiverMutex);
        if (!m_hasReceiver)
            return;
        m_hasReceiver = false;
    }
    m_manager->waitLoop();
}

} // namespace Bluetooth
