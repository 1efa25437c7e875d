// SPDX-License-Identifier: LGPL-2.1-or-later
#include "main_loop.h"

#include "common/stop_request.h"

#include <poll.h>
#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <utility>
#include <vector>

namespace AutoConnectd {

namespace {
constexpr std::chrono::seconds renewalPause{10};
}

void MainLoop::handleCommands() {
    const std::vector<Command> commands = m_pipe->read();
    m_pipe->unknown().log(Clock::now());
    m_connector.handle(commands);
}

/// Once the pipe was removed from its folder, commands come through a new one.
void MainLoop::renewPipe(Clock::time_point now) {
    if (m_pipe->isCurrent()) { // maybe again: what stood in its place has gone
        m_renewalDue = Clock::time_point::max();
        return;
    }
    const bool isAgain = m_renewalDue != Clock::time_point::max();
    if (isAgain && now < m_renewalDue)
        return;
    std::string problem;
    auto next = CommandPipe::open(m_pipe->path(), problem);
    m_renewalDue = next ? Clock::time_point::max() : now + renewalPause;
    if (next) {
        handleCommands(); // the last that came through the old one
        m_pipe = std::move(next);
    } else if (!isAgain) {
        syslog(LOG_WARNING, "%s", problem.c_str());
    }
}

Clock::time_point MainLoop::nextDue() const {
    return std::min({m_connector.nextDue(), m_pipe->unknown().due(), m_renewalDue});
}

void MainLoop::wait() const {
    pollfd watched[] = {{m_pipe->descriptor(), POLLIN, 0},
                        {m_pipe->watchDescriptor(), POLLIN, 0},
                        {wakeupDescriptor(), POLLIN, 0},
                        {Tools::stopDescriptor(), POLLIN, 0}};
    const auto left =
        std::chrono::ceil<std::chrono::milliseconds>(nextDue() - Clock::now()).count();
    poll(watched, std::size(watched), static_cast<int>(std::max<std::int64_t>(left, 0)));
}

int MainLoop::run() {
    m_connector.reload();
    while (!Tools::stopRequested()) {
        m_connector.work();
        wait();
        handleCommands();
        m_connector.handle(takeNews());
        renewPipe(Clock::now());
        if (!m_connector.hasBus()) {
            // Not program.fail(): in the foreground the log itself goes to standard error by now.
            syslog(LOG_CRIT, "the system bus has gone; start again when it is back");
            return EXIT_FAILURE;
        }
    }
    syslog(LOG_NOTICE, "stopped");
    return EXIT_SUCCESS;
}

} // namespace AutoConnectd
