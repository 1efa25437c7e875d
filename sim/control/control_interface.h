// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_CONTROL_CONTROL_INTERFACE_H
#define KESBLUETOOTH_SIM_CONTROL_CONTROL_INTERFACE_H

#include "control/call_log.h"
#include "control/faults.h"
#include "control/world_control.h"
#include "daemon/bluetoothd.h"
#include "serving.h"
#include "serving/bus/bus_connection.h"
#include "serving/bus/object_tree.h"

#include <functional>
#include <memory>
#include <string>

namespace Bluetooth::Sim {

/// com.kestrine.bluetooth.Sim: what tests and people do to the simulation, apart from what it
/// simulates, on a connection and under a name of its own.
///
/// Each call is carried out after everything that its caller sent to the daemon before, and is
/// answered after everything that the daemon sent because of it has passed the bus.
class ControlInterface {
public:
    /// @param verbose  whether each call to the daemon is written to stderr
    ControlInterface(World& world, const std::string& busAddress, bool verbose);
    ControlInterface(const ControlInterface&) = delete;
    ControlInterface& operator=(const ControlInterface&) = delete;
    ~ControlInterface();

    Bluetoothd& daemon() { return m_daemon; }
    void watchQuit(std::function<void()> onQuit) { m_quit = std::move(onQuit); }

private:
    static const Interface& table();

    bool beforeCall(const CallPtr& call);
    void received(const CallPtr& call);
    void afterDaemonsMessages(std::function<void()> next);
    void whenGone(std::function<void()> next);
    static void carryOut(const CallPtr& call, const std::function<void()>& what);

    /// Lets the world change, and answers with what came of it.
    template <auto Function>
    void inWorld(const CallPtr& call);
    void emitSignal(const CallPtr& call);
    void callAgent(const CallPtr& call);
    void failNext(const CallPtr& call);
    void delayNext(const CallPtr& call);
    void clearFaults(const CallPtr& call);
    void getCalls(const CallPtr& call);
    void clearCalls(const CallPtr& call);
    void dropName(const CallPtr& call);
    void regainName(const CallPtr& call);
    void restart(const CallPtr& call);
    void quit(const CallPtr& call);

    void done(const CallPtr& call, const Value& results = {});

    bool m_verbose;
    Bluetoothd m_daemon;
    WorldControl m_worldControl;
    Faults m_faults;
    CallLog m_calls;
    std::function<void()> m_quit;
    ObjectTree m_objects;
    BusConnection m_bus;
};

} // namespace Bluetooth::Sim

#endif
