// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_CHANNEL_H
#define KESBLUETOOTH_SIM_DAEMON_CHANNEL_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bus/one_shot_timer.h"

#include <functional>
#include <optional>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// A channel to one service of a device. It holds the link.
class Channel {
public:
    /// What is opened, and what an attempt fails with when not by the device's refusal.
    struct Target {
        std::string uuid;     ///< the service, in full; "" when nothing listens there
        bool searched;        ///< whether the service's record is read before
        const char* off;      ///< the error when the adapter is off
        const char* notThere; ///< the error when the device does not answer
    };
    /// @param failure  the text of the error, or null when the channel is open
    using OnEnd = std::function<void(const char* failure)>;

    explicit Channel(ServedDevice& device) : m_device(device) {}

    bool opening() const { return m_state == State::Opening; }
    bool isOpen() const { return m_state == State::Open; }

    void open(const Target& target, OnEnd onEnd);
    /// The device has opened it.
    void accept();
    /// Closes it, or gives the attempt up; nobody is told.
    void close();
    /// Ends an attempt with an error, and closes.
    void linkLost();

private:
    enum class State { Closed, Opening, Open };

    void reached(const Target& target);
    void end(const char* failure);

    ServedDevice& m_device;
    State m_state = State::Closed;
    Link::Hold m_hold;
    OneShotTimer m_timer;
    OnEnd m_onEnd;
};

/// The target of a channel to one of the service's own protocols.
inline Channel::Target serviceOf(const std::string& uuid) {
    return {uuid, false, "connect: No route to host (113)", "Host is down (112)"};
}

} // namespace Bluetooth::Sim

#endif
