#include "daemon/daemon.h"

#include "daemon/adapter.h"
#include "daemon/manager.h"
#include "world/address.h"

#include <algorithm>

namespace Bluetooth::Sim {

Daemon::Daemon(World& world, std::string busAddress, std::function<bool(const CallPtr&)> beforeCall)
    : world_(world), busAddress_(std::move(busAddress)), beforeCall_(std::move(beforeCall)) {}

Daemon::~Daemon() {
    clear();
}

void Daemon::start(int pid) {
    pid_ = pid;
    auto bus = std::make_unique<BusLink>(busAddress_, [this](const CallPtr& call) {
        if (!beforeCall_(call))
            dispatch(call);
    });
    manager_ = std::make_unique<Manager>(*this);
    bus->watchClients([this](const std::string& client) {
        for (const auto& adapter : adapters_)
            adapter->clientGone(client);
    });
    bus->watchBus([this] {
        if (busEnded_)
            busEnded_();
    });
    try {
        bus->own("org.bluez");
    } catch (const std::exception&) {
        manager_.reset();
        throw;
    }
    bus_ = std::move(bus);
    for (const auto& hardware : world_.adapters)
        plugIn(hardware);
}

void Daemon::vanish() {
    clear();
}

void Daemon::stop() {
    for (const auto& adapter : adapters_)
        adapter->releaseAgents();
    clear();
}

void Daemon::clear() {
    // Adapters use the bus until they are gone; nothing of theirs is said on the way out.
    adapters_.clear();
    manager_.reset();
    if (burial_)
        g_source_remove(burial_);
    burial_ = 0;
    ended_.clear();
    bus_.reset();
}

void Daemon::plugIn(const std::shared_ptr<AdapterHardware>& hardware) {
    for (const auto& other : adapters_)
        for (int times = 0; times < 2; ++times)
            other->uuidsChanged();
    adapters_.push_back(std::make_unique<Adapter>(*this, hardware));
    adapters_.back()->announce();
    manager_->adapterAdded(*adapters_.back());
    adapters_.back()->comeUp();
}

void Daemon::pullOut(Adapter& adapter) {
    const bool wasDefault = adapters_.front().get() == &adapter;
    const std::string path = adapter.path();
    adapter.goDown();
    const auto found = std::find_if(adapters_.begin(), adapters_.end(),
                                    [&](const auto& other) { return other.get() == &adapter; });
    bury(std::shared_ptr<Adapter>(std::move(*found)));
    adapters_.erase(found);
    manager_->adapterRemoved(path, wasDefault);
}

Adapter* Daemon::find(const std::string& idOrAddress) const {
    const auto found = std::find_if(adapters_.begin(), adapters_.end(), [&](const auto& adapter) {
        return adapter->hardware().id() == idOrAddress ||
               adapter->hardware().address == upperCase(idOrAddress);
    });
    return found == adapters_.end() ? nullptr : found->get();
}

void Daemon::bury(std::shared_ptr<void> ended) {
    ended_.push_back(std::move(ended));
    if (burial_)
        return;
    burial_ = g_idle_add(
        [](gpointer data) -> gboolean {
            auto* daemon = static_cast<Daemon*>(data);
            daemon->burial_ = 0;
            const auto buried = std::move(daemon->ended_);
            daemon->ended_.clear();
            return G_SOURCE_REMOVE;
        },
        this);
}

} // namespace Bluetooth::Sim
