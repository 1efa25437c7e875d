#pragma once

#include "bus/bus_link.h"
#include "daemon/agent.h"
#include "world/peer.h"
#include "world/timer.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class Device;

/// One pairing, begun by a CreatePairedDevice call or by the device itself.
///
/// The two sides' capabilities decide what the agent is asked; the device's behaviour how it ends.
class Pairing {
public:
    static std::shared_ptr<Pairing> outgoing(Device& device, const CallPtr& call);
    static std::shared_ptr<Pairing> incoming(Device& device);

    Pairing(Device& device, CallPtr call, std::shared_ptr<Agent> agent);
    Pairing(const Pairing&) = delete;
    Pairing& operator=(const Pairing&) = delete;
    ~Pairing();

    /// The unique name of the client that wants it; "" when the device began it.
    std::string owner() const;
    /// Who is asked, or null.
    const Agent* agent() const { return agent_.get(); }
    void begin();
    /// CancelDeviceCreation of the owner.
    void cancel(const CallPtr& call);
    void linkLost();
    void powerLost();
    void ownerGone();
    /// The daemon stops.
    void releaseAgent();

private:
    void negotiate();
    void askForPin();
    void displayPin();
    void askByCapabilities();
    void confirm(guint32 passkey);
    void enter(guint32 passkey, bool typedOnBothSides);
    void display(guint32 passkey, guint8 entered);
    void ask(const char* member, const Value& arguments, const char* results,
             Agent::OnAnswer onAnswer);
    void answered(bool right);
    void finish();
    void succeed();
    void fail(const BusError& error);
    void end();
    static void removeFailed(const std::shared_ptr<Device>& device, bool outgoing);
    void stopTimers();
    guint32 passkey() const;
    guint duration() const;

    Device& device_;
    CallPtr call_; ///< null when the device began the pairing
    std::shared_ptr<Agent> agent_;
    bool outgoing_;
    bool displaying_ = false;
    bool cancelled_ = false;
    bool done_ = false;
    Timer timer_;
    Timer timeout_;
    Timer loss_;
};

} // namespace Bluetooth::Sim
