// SPDX-License-Identifier: LGPL-2.1-or-later
#include "scanner/scanner_state.h"

#include <bluetooth/adapter.h>

#include <algorithm>
#include <utility>

namespace Bluetooth {

namespace {

using Lock = std::lock_guard<std::mutex>;

} // namespace

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

bool ScannerState::addDevice(const Set& set, const std::string& address, const std::string& text) {
    const Lock lock(m_mutex);
    if (set)
        set->insert(address);
    return keep(address, text);
}

/// Under the lock. @return whether a device had to go for the first time
bool ScannerState::keep(const std::string& address, const std::string& text) {
    const std::optional<std::string> gone = m_devices.put(address, text);
    if (!gone)
        return false;
    for (const StartedDiscovery& discovery : m_discoveries)
        discovery.found->erase(*gone);
    return !std::exchange(m_hadTooMany, true);
}

void ScannerState::removeDevice(const Set& set, const std::string& address) {
    const Lock lock(m_mutex);
    if (set)
        set->erase(address);
}

std::vector<std::pair<std::string, std::string>>
ScannerState::unknownDevices(const AddressSet& set) {
    std::vector<std::pair<std::string, std::string>> devices;
    const Lock lock(m_mutex);
    for (const std::string& address : set) {
        const std::string* text = m_devices.find(address);
        if (text && m_filter.count(address) == 0)
            devices.emplace_back(address, *text);
    }
    return devices;
}

void ScannerState::putText(const std::string& address, const std::string& text) {
    const Lock lock(m_mutex);
    keep(address, text);
}

std::string ScannerState::text(const std::string& address) {
    const Lock lock(m_mutex);
    if (const std::string* text = m_devices.find(address))
        return *text;
    keep(address, "");
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
