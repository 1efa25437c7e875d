// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/input.h>

#include "bluez/factory.h"
#include "core/method_call.h"

namespace Bluetooth {

Input::Input(const char* path) : BluezObject(path, "org.bluez.Input") {}

Input::~Input() {
    unsubscribeAll();
}

Input* Input::getInput(const char* path) {
    return makeProxy<Input>(path);
}

int Input::connect() {
    return callMethod(KES_HERE, *this, "Connect");
}

int Input::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

} // namespace Bluetooth
