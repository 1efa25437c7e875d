// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_ECHO_H
#define KESBLUETOOTH_SIM_DAEMON_ECHO_H

#include <glib.h>

#include <functional>
#include <string>

namespace Bluetooth::Sim {

/// A device's end of a serial line: what comes in is sent back.
class Echo {
public:
    /// @param descriptor  the line, which is owned from now on
    /// @param onHangUp  called when the other end has closed it; may destroy this
    Echo(int descriptor, std::function<void()> onHangUp);
    Echo(const Echo&) = delete;
    Echo& operator=(const Echo&) = delete;
    ~Echo();

    /// Sends something of the device's own.
    void send(const std::string& text);

private:
    static gboolean ready(gint, GIOCondition condition, gpointer data);
    /// @return false when the line has ended
    bool receive();
    bool flush();
    void watch();

    int m_descriptor;
    std::function<void()> m_onHangUp;
    std::string m_unsent;
    guint m_source = 0;
};

} // namespace Bluetooth::Sim

#endif
