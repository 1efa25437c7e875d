// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_LINK_H
#define KESBLUETOOTH_SIM_DAEMON_LINK_H

#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"
#include "world/times.h"

#include <functional>
#include <list>
#include <utility>
#include <vector>

namespace Bluetooth::Sim {

class ServedDevice;

/// The connection to one device: reached, used, dropped.
class Link {
public:
    using OnPaged = std::function<void(bool reached)>;

    /// While one of these is held, the link does not drop for want of use.
    class Hold {
    public:
        Hold() = default;
        explicit Hold(Link& link) : m_link(&link) { ++link.m_holds; }
        Hold(Hold&& other) noexcept : m_link(std::exchange(other.m_link, nullptr)) {}
        Hold& operator=(Hold&& other) noexcept {
            release();
            m_link = std::exchange(other.m_link, nullptr);
            return *this;
        }
        ~Hold() { release(); }
        /// @param idle  how long the link stays when this was its last use
        void release(guint Times::*idle = &Times::idleDisconnect) {
            if (Link* link = std::exchange(m_link, nullptr))
                link->released(*this, idle);
        }

    private:
        Link* m_link = nullptr;
    };

    explicit Link(ServedDevice& device) : m_device(device) {}

    bool up() const { return m_up; }

    /// Reaches the device, at once when it is connected already.
    /// @param hold  the caller's; it stays where it is, and its release ends the waiting
    void connect(const Hold& hold, OnPaged onPaged);
    /// The device has connected to us.
    /// @param stays  whether it keeps the link for itself
    void accept(bool stays);
    Hold hold();
    /// Disconnects now, and says so.
    void drop();
    /// The adapter goes off: drops the link, or gives up reaching the device.
    void powerLost();
    /// Announces the end of the link, waits, answers the call if there is one, and disconnects.
    void requestDisconnect(const CallPtr& call);
    /// Forgets everything without a word; the device has gone.
    void abandon();

private:
    struct Waiting {
        const Hold* hold;
        OnPaged onPaged;
    };

    void page();
    void paged(bool reached);
    void comeUp();
    void released(const Hold& hold, guint Times::*idle);

    ServedDevice& m_device;
    bool m_up = false;
    bool m_heldByPeer = false;
    unsigned m_holds = 0;
    std::list<Waiting> m_waiting;
    std::list<Waiting> m_answered; ///< those whose turn it is, once the device was reached or not
    std::vector<CallPtr> m_disconnects;
    OneShotTimer m_pager;
    OneShotTimer m_idle;
    OneShotTimer m_disconnect;
};

} // namespace Bluetooth::Sim

#endif
