// SPDX-License-Identifier: LGPL-2.1-or-later
#include "scanner/finders.h"

#include <bluetooth/adapter.h>
#include <bluetooth/manager.h>
#include <bluetooth/scanner_server.h>

#include "bluez/device_address.h"
#include "scanner/dbus_glib.h"
#include "scanner/scan_text.h"

#include <chrono>
#include <cstring>

namespace Bluetooth {

namespace {

void onDeviceFound(RemoteObject* sender, const char* address, const Dict* properties) {
    Finders* finders = currentFinders();
    if (finders && isAddress(address))
        finders->deviceFound(sender, address, scanText(*properties));
}

void onDeviceDisappeared(RemoteObject* sender, const char* address) {
    Finders* finders = currentFinders();
    if (finders && isAddress(address))
        finders->deviceDisappeared(sender, address);
}

std::string lastComponent(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

/// What the daemon knows the adapter by: "hci0" for an object path, which it does not look up.
std::string patternOf(const std::string& adapterId) {
    return adapterId.rfind('/', 0) == 0 ? lastComponent(adapterId) : adapterId;
}

} // namespace

std::unique_ptr<Adapter> Finders::findAdapter(const char* pattern) {
    const bool isTooLong = pattern && std::strlen(pattern) > longestAdapterId;
    if (isTooLong || !m_server.fetchManager())
        return nullptr;
    // A proxy of its own: finders are made on two threads, and a proxy serves one at a time.
    Manager manager;
    std::unique_ptr<Adapter> adapter(manager.findAdapter(pattern));
    if (adapter && lastComponent(adapter->getPath()) == "any")
        return nullptr;
    return adapter;
}

Finders::Set Finders::add(ScannerObject& object, const std::string& adapterId) {
    const std::shared_ptr<Adapter> adapter = findAdapter(patternOf(adapterId).c_str());
    if (!adapter)
        return nullptr;
    auto set = std::make_shared<AddressSet>();

    adapter->startDiscovery();
    // Before the subscriptions: what is found at once is to find its finder. After the start: who
    // removes the finder meanwhile stops a discovery that has begun.
    m_state.addFinder(object, adapterId, {adapter, set});
    adapter->setDeviceFoundHandler(onDeviceFound);
    adapter->setDeviceDisappearedHandler(onDeviceDisappeared);
    // The new set even when the adapter had one: what is looked up in it is not found then.
    return set;
}

Finders::Set Finders::of(ScannerObject& object, const std::string& path) {
    Set set = m_state.finder(object, path);
    return set ? set : add(object, path);
}

void Finders::remove(ScannerObject& object, Adapter& adapter) {
    const std::string path = adapter.getPath();
    StartedDiscovery removed = m_state.takeDiscovery(path);
    if (removed.adapter)
        adapter.stopDiscovery();
    // Waits for its callback on the receive thread, which may still make use of the finder.
    removed.adapter.reset();
    m_state.forgetFinder(object, path);
}

void Finders::showUnknownDevices(const AddressSet& set, const ScannerState::Show& show) {
    m_server.updateFilterSet();
    m_state.showUnknownDevices(set, show);
}

void Finders::awaitAnswersWritten() {
    constexpr long mostWaiting = 8 * 1024 * 1024;
    if (!m_server.m_connection)
        return;
    DBusConnection* const connection = DBusGlib::load()->getConnection(m_server.m_connection);
    // A bus may read no more because somebody does not: the loop's timer has to go on.
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(1);
    while (dbus_connection_get_outgoing_size(connection) > mostWaiting &&
           std::chrono::steady_clock::now() < end)
        dbus_connection_read_write(connection, 100);
}

// A signal makes a finder where there is none any more.

void Finders::deviceFound(const RemoteObject* sender, const std::string& address,
                          const std::string& text) {
    if (m_state.isListening(sender))
        m_state.addDevice(of(m_served, sender->getPath()), address, text);
}

void Finders::deviceDisappeared(const RemoteObject* sender, const std::string& address) {
    if (m_state.isListening(sender))
        m_state.removeDevice(of(m_served, sender->getPath()), address);
}

} // namespace Bluetooth
