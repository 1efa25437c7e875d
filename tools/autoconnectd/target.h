// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_TARGET_H
#define KESBT_AUTOCONNECTD_TARGET_H

#include "attempt.h"
#include "failures.h"
#include "service.h"

#include <chrono>
#include <memory>
#include <string>

namespace Bluetooth {
class BluezObject;
} // namespace Bluetooth

namespace AutoConnectd {

/// How long to wait before the next attempt at a device that is away: the first time `first`, then
/// twice as long each time, up to `longest`.
struct Pace {
    std::chrono::seconds first;
    std::chrono::seconds longest;
};

/// One service of one device, which is to be connected.
class Target {
public:
    /// @param device its object path
    Target(const std::string& device, const Service& service, Pace pace);
    ~Target();

    bool isOf(const std::string& device, const Service& service) const;
    /// What it is, for people: "audio of 00:11:22:33:44:55".
    const std::string& name() const { return m_name; }

    enum class Opening { Done, NotServed, NotAnswered };
    /// Subscribes, and asks for the state. @return what the daemon says to that
    Opening open();

    /// Reckons with an attempt that was made before this target was there.
    void wasTried(Clock::time_point when);
    /// The last attempt; the clock's zero when there was none.
    Clock::time_point tried() const { return m_tried; }

    /// Asks the daemon for the state, logs a change and what became of an attempt, and connects
    /// when the device is away, an attempt is due and `mayConnect` is set.
    /// @return false when the daemon does not know the device any more
    bool check(Clock::time_point now, bool mayConnect);

    /// Makes an attempt due at once: the user asks for it.
    void hurry();
    /// Goes back to the first interval, reckoned from the last attempt: signals ask for it, and
    /// however many come, the device is not tried more often than that.
    void beginAgain();

    bool isConnected() const { return m_connected; }
    /// When the next attempt is due, or the running one is given up; meaningless while connected.
    Clock::time_point due() const { return m_attempt.isRunning() ? m_attempt.deadline() : m_due; }

private:
    bool queryConnected(bool& connected);
    void noteConnection(bool connected, Clock::time_point now);
    void connect(Clock::time_point now);

    const Service& m_service;
    std::string m_path;
    std::string m_name;
    Pace m_pace;
    std::unique_ptr<Bluetooth::BluezObject> m_proxy;
    Attempt m_attempt;
    Failures m_failures;
    bool m_connected = false;
    bool m_announced = false; // that it is being waited for
    Clock::time_point m_tried{};
    Clock::time_point m_due{};
    std::chrono::seconds m_delay;
};

} // namespace AutoConnectd

#endif
