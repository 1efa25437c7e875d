// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/auto_connect.h>

#include <bluetooth/fifo.h>

#include <cerrno>
#include <cstring>
#include <memory>

namespace Bluetooth {

bool AutoConnect::sendCommand(const char* command) const {
    const std::unique_ptr<Fifo> pipe(Fifo::getWriteFifo("/tmp/kes_bluetooth_autoconnect"));
    if (!pipe)
        return false;
    if (!command) {
        errno = EINVAL;
        return false;
    }
    return pipe->writeData(command, static_cast<int>(strlen(command))) == 0;
}

bool AutoConnect::reload() const {
    return sendCommand("1");
}

bool AutoConnect::pause() const {
    return sendCommand("pause");
}

bool AutoConnect::resume() const {
    return sendCommand("resume");
}

} // namespace Bluetooth
