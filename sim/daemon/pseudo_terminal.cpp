// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/pseudo_terminal.h"

#include <fcntl.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <utility>

namespace Bluetooth::Sim {

std::unique_ptr<PseudoTerminal> PseudoTerminal::make() {
    const int device = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
    if (device < 0)
        return nullptr;
    char name[64] = "";
    int terminal = -1;
    if (grantpt(device) == 0 && unlockpt(device) == 0 && ptsname_r(device, name, sizeof name) == 0)
        terminal = open(name, O_RDWR | O_NOCTTY | O_CLOEXEC);
    termios settings{};
    if (terminal < 0 || tcgetattr(terminal, &settings) != 0) {
        const int error = errno;
        close(device);
        if (terminal >= 0)
            close(terminal);
        errno = error;
        return nullptr;
    }
    // Bytes pass as they are, and only the device echoes.
    cfmakeraw(&settings);
    tcsetattr(terminal, TCSANOW, &settings);
    return std::unique_ptr<PseudoTerminal>(new PseudoTerminal(device, terminal, name));
}

PseudoTerminal::PseudoTerminal(int device, int terminal, std::string name)
    : m_name(std::move(name)),
      m_terminal(terminal),
      m_device(std::make_unique<Echo>(device, [this] { hangUp(); })) {}

void PseudoTerminal::hangUp() {
    m_device.reset();
    if (m_terminal >= 0)
        close(std::exchange(m_terminal, -1));
}

} // namespace Bluetooth::Sim
