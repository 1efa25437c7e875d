// SPDX-License-Identifier: LGPL-2.1-or-later
#include "wait/watchdog.h"

#include "show/failure.h"

#include <unistd.h>

#include <algorithm>
#include <iostream>

namespace Kesbt {

namespace {

/// How long the daemon may take to carry a cancellation out.
constexpr std::chrono::seconds grace{5};
constexpr std::chrono::seconds progressInterval{5};

} // namespace

Watchdog::Watchdog(const TimeLimit& limit, Task task)
    : m_task(std::move(task)),
      m_deadline(limit.end()),
      m_canBeLonger(limit.canBeLonger()),
      m_thread([this] { watch(); }) {}

Watchdog::~Watchdog() {
    m_hasEnded = true;
    m_ended.raise();
    m_thread.join();
}

void Watchdog::throwIfCancelled() const {
    if (m_reason != Reason::None)
        throw Failure(message(m_reason));
}

void Watchdog::watch() {
    if (awaitEnd(m_deadline))
        return;
    if (m_task.questions)
        m_task.questions->end();
    m_task.cancel();
    // A daemon that does not answer any more must not keep the user waiting: leaving the bus ends
    // the call too.
    const Reason reason = m_reason;
    if (awaitEnd(Clock::now() + grace))
        return;
    std::cerr << message(reason) << '\n';
    _exit(1);
}

/// @return whether the call has ended; false with the reason why it should be
bool Watchdog::awaitEnd(Clock::time_point deadline) {
    const bool cancelled = m_reason != Reason::None;
    while (!m_hasEnded) {
        const auto now = Clock::now();
        if (m_interrupt.take()) {
            m_reason = Reason::Interrupted;
            return false;
        }
        if (now >= deadline) {
            if (!cancelled)
                m_reason = isAsking() ? Reason::Unanswered : Reason::TimedOut;
            return false;
        }
        auto next = deadline;
        if (m_task.showsProgress && !cancelled)
            next = std::min(next, now + progressInterval);
        awaitInput(next);
        if (next < deadline && Clock::now() >= next)
            showProgress();
    }
    return true;
}

/// Waits for what ends the task, and attends to the questions.
void Watchdog::awaitInput(Clock::time_point limit) {
    Questions* questions = m_task.questions;
    if (!questions) {
        waitForInput({m_interrupt.fd(), m_ended.fd()}, limit);
        return;
    }
    waitForInput({m_interrupt.fd(), m_ended.fd(), questions->wakeFd(), questions->inputFd()},
                 std::min(limit, questions->due()));
    questions->attend();
}

void Watchdog::showProgress() const {
    if (isAsking())
        return; // who is asked sees what is waited for
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - m_begin);
    std::cerr << "Still " << m_task.name << " (" << seconds.count() << " s)\n";
}

std::string Watchdog::message(Reason reason) const {
    if (reason == Reason::Interrupted)
        return "interrupted while " + m_task.name + "; repeat the command to try again";
    if (reason == Reason::Unanswered)
        return "the question was not answered in time; repeat the command and answer, or give a "
               "longer --timeout";
    return "time is over while " + m_task.name +
           "; make sure that the device is on and within reach" +
           (m_canBeLonger ? ", or give a longer --timeout" : "");
}

} // namespace Kesbt
