// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_WAKING_FLAG_H
#define KESBLUETOOTH_CORE_WAKING_FLAG_H

#include <atomic>

namespace Bluetooth {

/// A flag for signal handlers to raise, with a descriptor that a thread can sleep on until then.
/// Lives as long as the process.
class WakingFlag {
public:
    WakingFlag() = default;
    WakingFlag(const WakingFlag&) = delete;
    WakingFlag& operator=(const WakingFlag&) = delete;

    /// Safe in a signal handler; leaves errno alone.
    void raise();
    void lower();
    bool isRaised() const { return m_raised; }

    /// Opens the descriptor, once. A flag that was raised before does not make it readable: ask
    /// isRaised() between this and a sleep.
    /// @return false when none can be had: sleeps must be short then
    bool open();
    /// For poll(): readable once the flag is raised. -1 before open().
    int descriptor() const { return m_fd; }
    /// Takes back a wake-up that no raised flag stands behind, such as that of a forked child,
    /// which shares the descriptor.
    void calm();

private:
    std::atomic<bool> m_raised{false};
    std::atomic<int> m_fd{-1};

    static_assert(std::atomic<bool>::is_always_lock_free && std::atomic<int>::is_always_lock_free,
                  "used in signal handlers");
};

} // namespace Bluetooth

#endif
