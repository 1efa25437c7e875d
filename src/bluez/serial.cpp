// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/serial.h>

#include "bluez/factory.h"
#include "core/method_call.h"

namespace Bluetooth {

Serial::Serial(const char* path) : BluezObject(path, "org.bluez.Serial") {}

Serial::~Serial() {
    unsubscribeAll();
}

Serial* Serial::getSerial(const char* path) {
    return makeProxy<Serial>(path);
}

int Serial::connect(const char* pattern, std::string& terminal) {
    return readMethod(KES_HERE, *this, "Connect", terminal, pattern) ? 0 : -1;
}

int Serial::disconnect(const char* terminal) {
    return callMethod(KES_HERE, *this, "Disconnect", terminal);
}

} // namespace Bluetooth
