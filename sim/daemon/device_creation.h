#pragma once

#include "bus/call.h"
#include "world/timer.h"

#include <string>

namespace Bluetooth::Sim {

class Device;

/// One CreateDevice call, from the new object to the reply.
class DeviceCreation {
public:
    DeviceCreation(Device& device, const CallPtr& call) : device_(device), call_(call) {}

    std::string owner() const { return call_->sender(); }
    void begin();
    /// CancelDeviceCreation: the device goes, then the caller of CreateDevice is told, then of
    /// this.
    void cancel(const CallPtr& call);
    void linkLost();
    void ownerGone();
    void powerLost() { linkLost(); }

private:
    void search();
    void succeed();
    void fail(const char* text);
    void end();
    void removeDevice();

    Device& device_;
    CallPtr call_;
    Timer timer_;
};

} // namespace Bluetooth::Sim
