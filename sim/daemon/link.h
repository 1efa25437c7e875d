#ifndef KESBLUETOOTH_SIM_DAEMON_LINK_H
#define KESBLUETOOTH_SIM_DAEMON_LINK_H

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

    explicit Link(Device& device) : m_device(device) {}

    bool up() const { return m_up; }

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

    Device& m_device;
    bool m_up = false;
    unsigned m_holds = 0;
    std::vector<OnPaged> m_waiting;
    std::vector<CallPtr> m_disconnects;
    Timer m_pager;
    Timer m_idle;
    Timer m_disconnect;
};

} // namespace Bluetooth::Sim

#endif
