// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_TARGET_H
#define KESBT_AUTOCONNECTD_TARGET_H

#include <chrono>
#include <memory>
#include <string>

namespace Bluetooth {
class Audio;
class AudioSink;
class Device;
} // namespace Bluetooth

namespace AutoConnectd {

using Clock = std::chrono::steady_clock;

/// How long to wait before the next attempt at a device that is away: the first time `first`, then
/// twice as long each time, up to `longest`.
struct Pace {
    std::chrono::seconds first;
    std::chrono::seconds longest;
};

/// One device that is to be connected: through its audio sink, or all its audio where it has none.
class Target {
public:
    /// @return null when the device offers no audio
    static std::unique_ptr<Target> create(Bluetooth::Device& device, Pace pace);
    ~Target();

    const std::string& path() const { return m_path; }
    const std::string& address() const { return m_address; }

    /// Reckons with an attempt that was made before this target was there.
    void wasTried(Clock::time_point when);
    /// The last attempt; the clock's zero when there was none.
    Clock::time_point tried() const { return m_tried; }

    /// Asks the daemon for the state, logs a change, and connects when the device is away, an
    /// attempt is due and `mayConnect` is set.
    /// @return false when the daemon does not know the device any more
    bool check(Clock::time_point now, bool mayConnect);

    /// Makes an attempt due at once: the user asks for it.
    void hurry();
    /// Goes back to the first interval, reckoned from the last attempt: signals ask for it, and
    /// however many come, the device is not tried more often than that.
    void beginAgain();

    bool isConnected() const { return m_connected; }
    /// When the next attempt is due; meaningless while connected.
    Clock::time_point due() const { return m_due; }

private:
    Target(std::string path, std::string address, Pace pace);

    bool queryConnected(bool& connected);
    void connect(Clock::time_point now);

    std::string m_path;
    std::string m_address;
    Pace m_pace;
    std::unique_ptr<Bluetooth::AudioSink> m_sink; // this or m_audio
    std::unique_ptr<Bluetooth::Audio> m_audio;
    bool m_connected = false;
    bool m_announced = false; // that it is being waited for
    Clock::time_point m_tried{};
    Clock::time_point m_due{};
    std::chrono::seconds m_delay;
};

} // namespace AutoConnectd

#endif
