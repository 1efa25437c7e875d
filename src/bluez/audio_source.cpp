// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/audio_source.h>

#include "bluez/factory.h"
#include "core/method_call.h"

namespace Bluetooth {

AudioSource::AudioSource(const char* path) : BluezObject(path, "org.bluez.AudioSource") {}

AudioSource::~AudioSource() {
    unsubscribeAll();
}

AudioSource* AudioSource::getAudioSource(const char* path) {
    return makeProxy<AudioSource>(path);
}

int AudioSource::connect() {
    return callMethod(KES_HERE, *this, "Connect");
}

int AudioSource::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

} // namespace Bluetooth
