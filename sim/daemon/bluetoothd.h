// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_BLUETOOTHD_H
#define KESBLUETOOTH_SIM_DAEMON_BLUETOOTHD_H

#include "daemon/audio/telephony_test.h"
#include "daemon/own_records.h"
#include "serving.h"
#include "serving/bus/bus_connection.h"
#include "serving/bus/object_tree.h"
#include "world/world.h"

#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

class ClientRecords;
class ServedAdapter;
class ServedManager;

/// The simulated bluetoothd: from its appearance as org.bluez to its end.
///
/// It may start and stop many times; the world, with all that is stored, stays.
class Bluetoothd {
public:
    /// @param beforeCall  sees each call first, and may answer it, or keep it for later: then true
    Bluetoothd(World& world, std::string busAddress,
               std::function<bool(const CallPtr&)> beforeCall);
    Bluetoothd(const Bluetoothd&) = delete;
    Bluetoothd& operator=(const Bluetoothd&) = delete;
    ~Bluetoothd();

    /// Joins the bus and plugs the world's adapters in.
    /// @param pid  the process id that is in all paths
    /// @throw std::runtime_error  when the bus or the name cannot be had
    void start(int pid);
    /// Leaves the bus at once, as a process that is killed.
    void vanish();
    /// Releases the agents first, as a process that is asked to stop.
    void stop();
    bool running() const { return m_bus != nullptr; }
    int pid() const { return m_pid; }
    /// Called when the bus itself ends.
    void watchBus(std::function<void()> onEnd) { m_busEnded = std::move(onEnd); }

    void dispatch(const CallPtr& call) { m_objects.dispatch(call); }
    void plugIn(const std::shared_ptr<AdapterHardware>& hardware);
    void pullOut(ServedAdapter& adapter);

    World& world() { return m_world; }
    const Times& times() const { return m_world.times; }
    BusConnection& bus() { return *m_bus; }
    ObjectTree& objects() { return m_objects; }
    ServedManager& manager() { return *m_manager; }
    OwnRecords& records() { return *m_records; }
    /// The records for all adapters.
    ClientRecords& anyRecords() { return *m_anyRecords; }
    /// Lets records change, then says whose class of device that has changed.
    void changeRecords(const std::function<void()>& change);
    const std::vector<std::unique_ptr<ServedAdapter>>& adapters() const { return m_adapters; }
    /// The adapter with that id or address, or null.
    ServedAdapter* find(const std::string& idOrAddress) const;
    /// The numbers that are in use for what the daemon names.
    struct Numbers {
        std::set<unsigned> networkInterfaces;
        unsigned nextProxy = 0;
    };
    Numbers& numbers() { return m_numbers; }
    std::string basePath() const { return "/org/bluez/" + std::to_string(m_pid); }

    /// Keeps an object that has ended until the code that runs in it has returned.
    void bury(std::shared_ptr<void> ended);

private:
    void clear();

    World& m_world;
    std::string m_busAddress;
    std::function<bool(const CallPtr&)> m_beforeCall;
    std::function<void()> m_busEnded;
    int m_pid = 0;
    Numbers m_numbers;
    guint m_burial = 0;
    std::vector<std::shared_ptr<void>> m_ended;
    ObjectTree m_objects;
    TelephonyTest m_telephony{m_objects};
    std::unique_ptr<BusConnection> m_bus;
    std::unique_ptr<ServedManager> m_manager;
    std::unique_ptr<OwnRecords> m_records;
    std::unique_ptr<ClientRecords> m_anyRecords;
    std::vector<std::unique_ptr<ServedAdapter>> m_adapters;
};

} // namespace Bluetooth::Sim

#endif
