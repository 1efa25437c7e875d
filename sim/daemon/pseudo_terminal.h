// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_PSEUDO_TERMINAL_H
#define KESBLUETOOTH_SIM_DAEMON_PSEUDO_TERMINAL_H

#include "daemon/echo.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

/// A terminal of the machine, in the place of /dev/rfcommN, with a simulated device behind it.
class PseudoTerminal {
public:
    /// @return null, with errno set, when the machine has no more of them
    static std::unique_ptr<PseudoTerminal> make();

    PseudoTerminal(const PseudoTerminal&) = delete;
    PseudoTerminal& operator=(const PseudoTerminal&) = delete;
    ~PseudoTerminal() { hangUp(); }

    const std::string& name() const { return m_name; }
    /// The device closes it: who reads from it gets its end.
    void hangUp();

private:
    PseudoTerminal(int device, int terminal, std::string name);

    std::string m_name;
    int m_terminal; ///< kept open as the daemon does: clients may close theirs and open it again
    std::unique_ptr<Echo> m_device;
};

} // namespace Bluetooth::Sim

#endif
