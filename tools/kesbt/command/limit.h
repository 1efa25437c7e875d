// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_LIMIT_H
#define KESBT_COMMAND_LIMIT_H

#include <chrono>
#include <functional>

namespace Kesbt {

using Clock = std::chrono::steady_clock;

/// What the time-out (25 s, or what the user gave with --timeout) means for a verb: each form of a
/// verb declares one of these. Except in a whole one each step has the time-out for itself: an
/// answer of the daemon, and a change to show; such verbs read through daemon/, which sees to it.
enum class Limit {
    Whole,     ///< it only reads: a time-out that was given is for all of it together
    Steps,     ///< it has nothing but steps
    Stream,    ///< then it goes on until it is interrupted
    Task,      ///< the daemon's work is cancelled when the time-out, at most 24.5 s, is over
    OnlyGiven, ///< it may take as long as it wants unless a time-out was given
};

/// The time that the verb has, from the one declaration. These apply it:
/// - withinLimit() to the library's calls: of a whole verb, in run(), or of a step, in daemon/;
/// - ask() of daemon/objects.h, to the calls that kesbt makes itself;
/// - Watchdog of wait/, which cancels the daemon's work;
/// - the callers of waitUntil() and waitForInput() of wait/, which pass it on.
class TimeLimit {
public:
    /// Takes the user's --timeout.
    void give(double seconds);
    bool isGiven() const { return m_isGiven; }
    /// Whether a longer --timeout than this would let an answer come later.
    bool canBeLonger() const;

    /// Runs a verb with the limit that it declares.
    void run(Limit limit, const std::function<void()>& verb);

    /// How long an answer of the daemon may take, and a change to show.
    std::chrono::milliseconds step() const { return m_step; }
    /// When something that begins now and is not a step has to be over; time_point::max() for
    /// never.
    Clock::time_point end() const;

private:
    std::chrono::milliseconds m_step = std::chrono::seconds(25);
    bool m_isGiven = false;
    Limit m_limit = Limit::Steps;
};

/// Ends the program with one line and status 1 when it outlives the time-out that the user gave.
/// Leaving the bus ends what the daemon did for it. For one thread; an inner one does nothing.
class AnswerAlarm {
public:
    AnswerAlarm();
    ~AnswerAlarm();
    AnswerAlarm(const AnswerAlarm&) = delete;
    AnswerAlarm& operator=(const AnswerAlarm&) = delete;
};

/// Holds calls of the library to the time-out: by themselves they wait for 25 s, whatever the user
/// gave. @return what they return
template <class Calls>
auto withinLimit(const Calls& calls) {
    const AnswerAlarm alarm;
    return calls();
}

} // namespace Kesbt

#endif
