// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_SESSION_SIGNAL_RELAY_H
#define KESBLUETOOTH_SERVING_SESSION_SIGNAL_RELAY_H

#include <glib.h>

#include <vector>

#include <sys/types.h>

namespace Bluetooth::Serving {

/// Passes the signals that ask us to stop on to a command, so that it ends first and we clean up.
class SignalRelay {
public:
    SignalRelay();
    SignalRelay(const SignalRelay&) = delete;
    SignalRelay& operator=(const SignalRelay&) = delete;
    ~SignalRelay();

    /// @param pid  the command, or 0 when there is none any more
    void setTarget(pid_t pid) { m_target = pid; }
    /// The signal that came before there was a command, or 0.
    int early() const;

private:
    template <int Signal>
    void add();
    void came(int signal);

    std::vector<guint> m_sources;
    pid_t m_target = 0;
    int m_early = 0;
};

} // namespace Bluetooth::Serving

#endif
