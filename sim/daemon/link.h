#pragma once

#include "bus/call.h"
#include "world/timer.h"

#include <functional>
#include <vector>

namespace Bluetooth::Sim {

class Device;

/// The connection to one device: reached, used, dropped.
class Link {
public:
    using OnPaged = std::function<void(bool reached)>;

    explicit Link(Device& device) : device_(device) {}

    bool up() const { return up_; }

    /// Reaches the device, at once when it is connected already.
    void connect(OnPaged onPaged);
    /// The device has connected to us.
    void accept();
    /// While it is held, the link does not drop for want of use.
    void hold();
    void release();
    /// Disconnects now, and says so.
    void drop();
    /// Announces the end of the link, waits, answers the call if there is one, and disconnects.
    void requestDisconnect(const CallPtr& call);
    /// Forgets everything without a word; the device has gone.
    void abandon();

private:
    void page();
    void paged(bool reached);
    void comeUp();

    Device& device_;
    bool up_ = false;
    unsigned holds_ = 0;
    std::vector<OnPaged> waiting_;
    std::vector<CallPtr> disconnects_;
    Timer pager_;
    Timer idle_;
    Timer disconnect_;
};

} // namespace Bluetooth::Sim
