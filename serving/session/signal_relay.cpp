// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/session/signal_relay.h"

#include <glib-unix.h>

#include <csignal>

#include <unistd.h>

namespace Bluetooth::Serving {

SignalRelay::SignalRelay() {
    add<SIGTERM>();
    add<SIGINT>();
    add<SIGHUP>();
}

SignalRelay::~SignalRelay() {
    for (const guint source : m_sources)
        g_source_remove(source);
}

template <int Signal>
void SignalRelay::add() {
    const auto onSignal = [](gpointer data) -> gboolean {
        static_cast<SignalRelay*>(data)->came(Signal);
        return G_SOURCE_CONTINUE;
    };
    m_sources.push_back(g_unix_signal_add(Signal, onSignal, this));
}

void SignalRelay::came(int signal) {
    // Ctrl-C on a terminal has reached the command already.
    const bool fromTerminal = signal == SIGINT && tcgetpgrp(STDIN_FILENO) == getpgrp();
    if (!m_target)
        m_early = signal;
    else if (!fromTerminal)
        kill(m_target, signal);
}

int SignalRelay::early() const {
    while (g_main_context_iteration(nullptr, FALSE)) {
    }
    return m_early;
}

} // namespace Bluetooth::Serving
