#include "command/answer_limit.h"

#include <sys/time.h>
#include <unistd.h>

#include <csignal>

namespace Kesbt {

namespace {

std::chrono::microseconds limit{0}; // 0 for none
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

void AnswerLimit::set(const Options& options) {
    if (!options.limited)
        return;
    limit = options.timeLimit();
    struct sigaction action {};
    action.sa_handler = timeIsOver;
    sigaction(SIGALRM, &action, nullptr);
}

AnswerLimit::AnswerLimit() {
    if (depth++ == 0 && limit.count() > 0)
        arm(limit);
}

AnswerLimit::~AnswerLimit() {
    if (--depth == 0)
        arm({});
}

} // namespace Kesbt
