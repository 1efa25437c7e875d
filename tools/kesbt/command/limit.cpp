// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/limit.h"

#include <sys/time.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>

namespace Kesbt {

namespace {

// The library's calls end after 25 s, and do not cancel what the daemon does.
constexpr std::chrono::milliseconds longestTask{24500};

// A process has one such timer.
std::chrono::microseconds alarmTime{0}; // 0 for none
int depth = 0;

void timeIsOver(int) {
    constexpr char line[] = "no answer within the time-out; try again or give a longer --timeout\n";
    [[maybe_unused]] const ssize_t written = write(STDERR_FILENO, line, sizeof line - 1);
    _exit(1);
}

void arm(std::chrono::microseconds time) {
    constexpr std::chrono::microseconds second = std::chrono::seconds(1);
    itimerval timer{};
    timer.it_value.tv_sec = time / second;
    timer.it_value.tv_usec = (time % second).count();
    setitimer(ITIMER_REAL, &timer, nullptr);
}

} // namespace

void TimeLimit::give(double seconds) {
    m_step = std::chrono::milliseconds(static_cast<long>(seconds * 1000));
    m_isGiven = true;
    alarmTime = m_step;
    struct sigaction action {};
    action.sa_handler = timeIsOver;
    sigaction(SIGALRM, &action, nullptr);
}

bool TimeLimit::canBeLonger() const {
    return m_isGiven && (m_limit == Limit::OnlyGiven || m_step < longestTask);
}

void TimeLimit::run(Limit limit, const std::function<void()>& verb) {
    m_limit = limit;
    if (limit == Limit::Whole)
        withinLimit(verb);
    else
        verb();
}

Clock::time_point TimeLimit::end() const {
    const bool isEndless = m_limit == Limit::Stream || (m_limit == Limit::OnlyGiven && !m_isGiven);
    if (isEndless)
        return Clock::time_point::max();
    return Clock::now() + (m_limit == Limit::Task ? std::min(m_step, longestTask) : m_step);
}

AnswerAlarm::AnswerAlarm() {
    if (depth++ == 0 && alarmTime.count() > 0)
        arm(alarmTime);
}

AnswerAlarm::~AnswerAlarm() {
    if (--depth == 0)
        arm({});
}

} // namespace Kesbt
