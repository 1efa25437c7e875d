#pragma once

#include "bus/call.h"
#include "world/timer.h"

#include <string>
#include <vector>

namespace Bluetooth::Sim {

class Adapter;

/// Power, discoverability and pairability of one adapter, with their time-outs, and the sessions
/// by which clients ask for power.
class AdapterMode {
public:
    explicit AdapterMode(Adapter& adapter);

    bool powered() const { return powered_; }
    bool discoverable() const { return discoverable_; }
    bool pairable() const;
    guint32 deviceClass() const;

    void comeUp();
    void goDown();

    /// Each answers a SetProperty call of its name; the value has the right type.
    void setPowered(const CallPtr& call, const Value& value);
    void setDiscoverable(const CallPtr& call, const Value& value);
    void setPairable(const CallPtr& call, const Value& value);
    void setDiscoverableTimeout(const CallPtr& call, const Value& value);
    void setPairableTimeout(const CallPtr& call, const Value& value);

    void requestSession(const CallPtr& call);
    void releaseSession(const CallPtr& call);
    void clientGone(const std::string& client);

private:
    void powerOn();
    void powerOff();
    void startDiscoverableTimeout();
    void startPairableTimeout();
    bool limited() const;
    void classChangedFrom(bool wasLimited);
    void sessionEnded();

    Adapter& adapter_;
    bool powered_ = false;
    bool discoverable_ = false;
    bool restoreDiscoverable_ = false; ///< what the next power-on brings back
    bool powerFromSession_ = false;
    Timer discoverableTimer_;
    Timer pairableTimer_;
    std::vector<std::string> sessions_; ///< owners, once for each session
};

} // namespace Bluetooth::Sim
