// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_MAIN_LOOP_H
#define KESBT_AUTOCONNECTD_MAIN_LOOP_H

#include "auto_connector.h"
#include "command_pipe.h"

#include <memory>

namespace AutoConnectd {

/// Lets the connector work whenever there is a command, news or an attempt that is due, and sleeps
/// in between.
class MainLoop {
public:
    MainLoop(AutoConnector& connector, std::unique_ptr<CommandPipe> pipe)
        : m_connector(connector), m_pipe(std::move(pipe)) {}

    /// Runs until a stop is requested, or the system bus has gone. @return what to exit with
    int run();

private:
    Clock::time_point nextDue() const;
    void wait() const;
    void handleCommands();
    void renewPipe(Clock::time_point now);

    AutoConnector& m_connector;
    std::unique_ptr<CommandPipe> m_pipe;
    Clock::time_point m_renewalDue = Clock::time_point::max(); // after one that failed
};

} // namespace AutoConnectd

#endif
