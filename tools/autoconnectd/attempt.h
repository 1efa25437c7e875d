// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_ATTEMPT_H
#define KESBT_AUTOCONNECTD_ATTEMPT_H

#include <dbus/dbus.h>

#include <chrono>
#include <memory>
#include <optional>
#include <string>

namespace Bluetooth {
class RemoteObject;
} // namespace Bluetooth

namespace AutoConnectd {

using Clock = std::chrono::steady_clock;

/// A call of Connect. It is not waited for, since a device that is away takes up to a minute; the
/// wakeup tells that its reply is there.
class Attempt {
public:
    void begin(const Bluetooth::RemoteObject& proxy, Clock::time_point now);
    bool isRunning() const { return m_call != nullptr; }
    /// When a running one is given up.
    Clock::time_point deadline() const { return m_deadline; }

    /// Takes what became of it.
    /// @return why it failed, for people; "" when it did not, or somebody else connects just now;
    ///         none while it runs, and when there was none
    std::optional<std::string> takeResult(Clock::time_point now);

private:
    struct Cancel {
        void operator()(DBusPendingCall* call) const;
    };

    std::unique_ptr<DBusPendingCall, Cancel> m_call;
    Clock::time_point m_deadline{};
};

} // namespace AutoConnectd

#endif
