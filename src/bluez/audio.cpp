// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/audio.h>

#include "bluez/factory.h"
#include "core/method_call.h"

namespace Bluetooth {

Audio::Audio(const char* path) : BluezObject(path, "org.bluez.Audio") {}

Audio::~Audio() {
    unsubscribeAll();
}

Audio* Audio::getAudio(const char* path) {
    return makeProxy<Audio>(path);
}

int Audio::connect() {
    return callMethod(KES_HERE, *this, "Connect");
}

int Audio::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

} // namespace Bluetooth
