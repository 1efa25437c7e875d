// SPDX-License-Identifier: LGPL-2.1-or-later
#include "scanner/scanner_state.h"

#include <bluetooth/adapter.h>

#include "core/log.h"

#include <algorithm>
#include <utility>

namespace Bluetooth {

void ScannerState::addFinder(ScannerObject& object, const std::string& path,
                             const StartedDiscovery& discovery) {
    const Lock lock(m_mutex);
    m_discoveries.push_back(discovery);
    object.finders.emplace(path, discovery.found);
    m_idleCountdown = ticksToLive;
}

ScannerState::Set ScannerState::finder(const ScannerObject& object, const std::string& path) const {
    const Lock lock(m_mutex);
    const auto finder = object.finders.find(path);
    return finder == object.finders.end() ? nullptr : finder->second;
}

void ScannerState::forgetFinder(ScannerObject& object, const std::string& path) {
    const Lock lock(m_mutex);
    object.finders.erase(path);
}

StartedDiscovery ScannerState::takeDiscovery(const std::string& path) {
    StartedDiscovery taken;
    const Lock lock(m_mutex);
    const auto first =
        std::find_if(m_discoveries.begin(), m_discoveries.end(),
                     [&](const auto& discovery) { return discovery.adapter->getPath() == path; });
    if (first != m_discoveries.end()) {
        taken = std::move(*first);
        m_discoveries.erase(first);
    }
    return taken;
}

std::vector<StartedDiscovery> ScannerState::takeAll(ScannerObject& object) {
    std::vector<StartedDiscovery> taken;
    const Lock lock(m_mutex);
    taken.swap(m_discoveries);
    object.finders.clear();
    return taken;
}

bool ScannerState::isListening(const RemoteObject* sender) const {
    const Lock lock(m_mutex);
    return std::any_of(m_discoveries.begin(), m_discoveries.end(), [sender](const auto& discovery) {
        return discovery.adapter.get() == sender;
    });
}

void ScannerState::addDevice(const Set& set, const std::string& address, const std::string& text) {
    Lock lock(m_mutex);
    if (set)
        set->insert(address);
    keep(std::move(lock), address, text);
}

/// Ends what is done under the lock: it is free when the first device that has to go is logged.
void ScannerState::keep(Lock lock, const std::string& address, const std::string& text) {
    const std::optional<std::string> gone = m_devices.put(address, text);
    if (!gone)
        return;
    for (const StartedDiscovery& discovery : m_discoveries)
        discovery.found->erase(*gone);
    if (std::exchange(m_hadTooMany, true))
        return;
    lock.unlock();
    logError(KES_HERE, "More than %zu devices were found, the oldest are left out from now on",
             FoundDevices::mostDevices);
}

void ScannerState::removeDevice(const Set& set, const std::string& address) {
    const Lock lock(m_mutex);
    if (set)
        set->erase(address);
}

void ScannerState::showUnknownDevices(const AddressSet& set, const Show& show) const {
    const Lock lock(m_mutex);
    for (const std::string& address : set) {
        const std::string* text = m_devices.find(address);
        if (text && m_filter.count(address) == 0)
            show(address, *text);
    }
}

void ScannerState::putText(const std::string& address, const std::string& text) {
    keep(Lock(m_mutex), address, text);
}

std::string ScannerState::text(const std::string& address) {
    Lock lock(m_mutex);
    if (const std::string* text = m_devices.find(address))
        return *text;
    keep(std::move(lock), address, "");
    return "";
}

void ScannerState::setFilter(AddressSet known) {
    const Lock lock(m_mutex);
    m_filter.swap(known);
}

bool ScannerState::isInFilter(const std::string& address) const {
    const Lock lock(m_mutex);
    return m_filter.count(address) > 0;
}

bool ScannerState::countDown() {
    const Lock lock(m_mutex);
    return --m_idleCountdown == 0;
}

} // namespace Bluetooth
