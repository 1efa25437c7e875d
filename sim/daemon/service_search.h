#pragma once

#include "bus/call.h"
#include "world/timer.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class Device;

/// One DiscoverServices call.
class ServiceSearch {
public:
    /// @return the search, or null when the call was answered at once
    static std::shared_ptr<ServiceSearch> begin(Device& device, const CallPtr& call);

    ServiceSearch(Device& device, const CallPtr& call, std::string uuid)
        : device_(device), call_(call), uuid_(std::move(uuid)) {}

    std::string owner() const { return call_->sender(); }
    /// The caller is told "Operation canceled".
    void cancel();
    void linkLost();
    /// Ends without an answer.
    void abandon();

private:
    void run();
    void finish();
    void end();

    Device& device_;
    CallPtr call_;
    std::string uuid_; ///< what is looked for; "" for everything
    Timer timer_;
};

} // namespace Bluetooth::Sim
