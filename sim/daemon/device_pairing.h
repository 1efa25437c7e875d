// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_PAIRING_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_PAIRING_H

#include "daemon/client_agent.h"
#include "daemon/link.h"
#include "serving.h"
#include "serving/bus/bus_connection.h"
#include "serving/bus/one_shot_timer.h"
#include "world/peer_device.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// One pairing, begun by a CreatePairedDevice call or by the device itself.
///
/// The two sides' capabilities decide what the agent is asked; the device's behaviour how it ends.
class DevicePairing {
public:
    static std::shared_ptr<DevicePairing> outgoing(ServedDevice& device, const CallPtr& call);
    static std::shared_ptr<DevicePairing> incoming(ServedDevice& device);

    DevicePairing(ServedDevice& device, CallPtr call, std::shared_ptr<ClientAgent> agent);
    DevicePairing(const DevicePairing&) = delete;
    DevicePairing& operator=(const DevicePairing&) = delete;
    ~DevicePairing();

    /// The unique name of the client that wants it; "" when the device began it.
    std::string owner() const;
    /// Who is asked, or null.
    const ClientAgent* agent() const { return m_agent.get(); }
    void begin();
    /// CancelDeviceCreation of the owner.
    void cancel(const CallPtr& call);
    void linkLost();
    void powerLost();
    void ownerGone();
    /// Stops without a word; the device has gone.
    void abandon();
    /// The daemon stops.
    void releaseAgent();

private:
    void negotiate();
    void askForPin();
    void displayPin();
    void askByCapabilities();
    void confirm(guint32 passkey);
    void enter(guint32 passkey, bool typedOnBothSides);
    void display(guint32 passkey);
    void ask(const char* member, const Value& arguments, const char* results,
             ClientAgent::OnAnswer onAnswer);
    void answered(bool right);
    void succeed();
    guint delayOf(const PairingEnd& end) const;
    void failLater(const PairingEnd& end);
    void fail(const BusError& error);
    void end();
    static void removeFailed(const std::shared_ptr<ServedDevice>& device, bool outgoing);
    void stopTimers();
    guint32 passkey() const;
    guint duration() const;

    ServedDevice& m_device;
    CallPtr m_call; ///< null when the device began the pairing
    std::shared_ptr<ClientAgent> m_agent;
    bool m_outgoing;
    bool m_cancelled = false;
    bool m_asking = false; ///< the agent, which may be busy with something else
    Link::Hold m_hold;
    OneShotTimer m_timer;
    OneShotTimer m_timeout;
    OneShotTimer m_loss;
};

} // namespace Bluetooth::Sim

#endif
