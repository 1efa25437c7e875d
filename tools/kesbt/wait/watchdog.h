// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_WAIT_WATCHDOG_H
#define KESBT_WAIT_WATCHDOG_H

#include "wait/questions.h"
#include "wait/waiting.h"

#include <atomic>
#include <functional>
#include <string>
#include <thread>

namespace Kesbt {

/// Watches over a call that blocks in the library: cancels it when the user interrupts the program
/// or the limit is over. Only one thread waits for the daemon, so the watching is done by another.
class Watchdog {
public:
    struct Task {
        std::string name;               ///< e.g. "creating 00:11:22:33:44:55", for messages
        std::function<void()> cancel;   ///< called at most once, on the watching thread
        bool showsProgress = false;     ///< tells on standard error every few seconds
        Questions* questions = nullptr; ///< what is asked meanwhile
    };

    Watchdog(const TimeLimit& limit, Task task);
    ~Watchdog();
    Watchdog(const Watchdog&) = delete;
    Watchdog& operator=(const Watchdog&) = delete;

    /// A Failure when the call failed because it was cancelled. Does nothing otherwise.
    void throwIfCancelled() const;

private:
    enum class Reason { None, Interrupted, TimedOut, Unanswered };

    void watch();
    bool awaitEnd(Clock::time_point deadline);
    bool isAsking() const { return m_task.questions && m_task.questions->isAsking(); }
    void awaitInput(Clock::time_point limit);
    void showProgress() const;
    std::string message(Reason reason) const;

    const Task m_task;
    const Clock::time_point m_begin = Clock::now();
    const Clock::time_point m_deadline;
    const bool m_canBeLonger;
    Interrupt m_interrupt;
    Wakeup m_ended;
    std::atomic<bool> m_hasEnded{false};
    std::atomic<Reason> m_reason{Reason::None};
    std::thread m_thread; // the last member: it uses the others
};

} // namespace Kesbt

#endif
