// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bluetoothd.h"

#include "daemon/client_records.h"
#include "daemon/served_adapter.h"
#include "daemon/served_manager.h"
#include "serving/bluez4/address.h"

#include <algorithm>

namespace Bluetooth::Sim {

Bluetoothd::Bluetoothd(World& world, std::string busAddress,
                       std::function<bool(const CallPtr&)> beforeCall)
    : m_world(world), m_busAddress(std::move(busAddress)), m_beforeCall(std::move(beforeCall)) {}

Bluetoothd::~Bluetoothd() {
    clear();
}

void Bluetoothd::start(int pid) {
    m_pid = pid;
    m_numbers = {};
    auto bus = std::make_unique<BusConnection>(m_busAddress, [this](const CallPtr& call) {
        if (!m_beforeCall(call))
            dispatch(call);
    });
    m_manager = std::make_unique<ServedManager>(*this);
    bus->watchClients([this](const std::string& client) {
        for (const auto& adapter : m_adapters)
            adapter->clientGone(client);
        m_anyRecords->clientGone(client);
    });
    bus->watchBus([this] {
        if (m_busEnded)
            m_busEnded();
    });
    try {
        bus->own("org.bluez");
    } catch (const std::exception&) {
        m_manager.reset();
        throw;
    }
    m_bus = std::move(bus);
    m_anyRecords = std::make_unique<ClientRecords>(*this, nullptr);
    m_records = std::make_unique<OwnRecords>([this](const std::string& id) {
        if (ServedAdapter* adapter = find(id))
            adapter->uuidsChanged();
    });
    for (const auto& hardware : m_world.adapters)
        plugIn(hardware);
}

void Bluetoothd::vanish() {
    clear();
}

void Bluetoothd::stop() {
    for (const auto& adapter : m_adapters)
        adapter->releaseAgents();
    clear();
}

void Bluetoothd::clear() {
    // Adapters use the bus until they are gone; nothing of theirs is said on the way out.
    m_adapters.clear();
    m_anyRecords.reset();
    m_manager.reset();
    m_objects.remove(basePath() + "/any");
    if (m_burial)
        g_source_remove(m_burial);
    m_burial = 0;
    m_ended.clear();
    m_bus.reset();
}

void Bluetoothd::plugIn(const std::shared_ptr<AdapterHardware>& hardware) {
    m_records->plugIn(hardware->id());
    for (const std::string& uuid : hardware->uuids)
        m_records->add({hardware->id(), uuid, ""});
    m_adapters.push_back(std::make_unique<ServedAdapter>(*this, hardware));
    m_adapters.back()->announce();
    m_manager->adapterAdded(*m_adapters.back());
    m_adapters.back()->comeUp();
}

void Bluetoothd::pullOut(ServedAdapter& adapter) {
    adapter.goDown();
    const auto found = std::find_if(m_adapters.begin(), m_adapters.end(),
                                    [&](const auto& other) { return other.get() == &adapter; });
    const std::shared_ptr<ServedAdapter> gone = std::move(*found);
    m_adapters.erase(found);
    m_records->pullOut(gone->hardware().id());
    m_manager->adapterRemoved(*gone);
    gone->releaseAgents();
    bury(gone);
}

void Bluetoothd::changeRecords(const std::function<void()>& change) {
    std::vector<guint32> before;
    for (const auto& adapter : m_adapters)
        before.push_back(adapter->mode().deviceClass());
    change();
    for (std::size_t i = 0; i < m_adapters.size(); ++i) {
        AdapterMode& mode = m_adapters[i]->mode();
        if (mode.powered() && mode.deviceClass() != before[i])
            m_adapters[i]->changed("Class", mode.deviceClass());
    }
}

ServedAdapter* Bluetoothd::find(const std::string& idOrAddress) const {
    const auto found = std::find_if(m_adapters.begin(), m_adapters.end(), [&](const auto& adapter) {
        return adapter->hardware().id() == idOrAddress ||
               adapter->hardware().address == upperCase(idOrAddress);
    });
    return found == m_adapters.end() ? nullptr : found->get();
}

void Bluetoothd::bury(std::shared_ptr<void> ended) {
    m_ended.push_back(std::move(ended));
    if (m_burial)
        return;
    m_burial = g_idle_add(
        [](gpointer data) -> gboolean {
            auto* daemon = static_cast<Bluetoothd*>(data);
            daemon->m_burial = 0;
            const auto buried = std::move(daemon->m_ended);
            daemon->m_ended.clear();
            return G_SOURCE_REMOVE;
        },
        this);
}

} // namespace Bluetooth::Sim
