#pragma once

#include "bus/bus_link.h"
#include "bus/object_tree.h"
#include "world/world.h"

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

class Adapter;
class Manager;

/// The simulated bluetoothd: from its appearance as org.bluez to its end.
///
/// It may start and stop many times; the world, with all that is stored, stays.
class Daemon {
public:
    /// @param beforeCall  sees each call first, and may answer it, or keep it for later: then true
    Daemon(World& world, std::string busAddress, std::function<bool(const CallPtr&)> beforeCall);
    Daemon(const Daemon&) = delete;
    Daemon& operator=(const Daemon&) = delete;
    ~Daemon();

    /// Joins the bus and plugs the world's adapters in.
    /// @param pid  the process id that is in all paths
    /// @throw std::runtime_error  when the bus or the name cannot be had
    void start(int pid);
    /// Leaves the bus at once, as a process that is killed.
    void vanish();
    /// Releases the agents first, as a process that is asked to stop.
    void stop();
    bool running() const { return bus_ != nullptr; }
    int pid() const { return pid_; }
    /// Called when the bus itself ends.
    void watchBus(std::function<void()> onEnd) { busEnded_ = std::move(onEnd); }

    void dispatch(const CallPtr& call) { objects_.dispatch(call); }
    void plugIn(const std::shared_ptr<AdapterHardware>& hardware);
    void pullOut(Adapter& adapter);

    World& world() { return world_; }
    const Times& times() const { return world_.times; }
    BusLink& bus() { return *bus_; }
    ObjectTree& objects() { return objects_; }
    Manager& manager() { return *manager_; }
    const std::vector<std::unique_ptr<Adapter>>& adapters() const { return adapters_; }
    /// The adapter with that id or address, or null.
    Adapter* find(const std::string& idOrAddress) const;
    std::string basePath() const { return "/org/bluez/" + std::to_string(pid_); }

    /// Keeps an object that has ended until the code that runs in it has returned.
    void bury(std::shared_ptr<void> ended);

private:
    void clear();

    World& world_;
    std::string busAddress_;
    std::function<bool(const CallPtr&)> beforeCall_;
    std::function<void()> busEnded_;
    int pid_ = 0;
    guint burial_ = 0;
    std::vector<std::shared_ptr<void>> ended_;
    ObjectTree objects_;
    std::unique_ptr<BusLink> bus_;
    std::unique_ptr<Manager> manager_;
    std::vector<std::unique_ptr<Adapter>> adapters_;
};

} // namespace Bluetooth::Sim
