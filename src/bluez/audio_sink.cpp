// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/audio_sink.h>

#include "bluez/factory.h"
#include "bluez/print.h"
#include "core/method_call.h"

namespace Bluetooth {

AudioSink::AudioSink(const char* path) : BluezObject(path, "org.bluez.AudioSink") {}

AudioSink::~AudioSink() {
    unsubscribeAll();
}

AudioSink* AudioSink::getAudioSink(const char* path) {
    return makeProxy<AudioSink>(path);
}

int AudioSink::connect() {
    return callMethod(KES_HERE, *this, "Connect");
}

int AudioSink::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

int AudioSink::isConnected(bool& connected) {
    return readMethod(KES_HERE, *this, "IsConnected", connected) ? 0 : -1;
}

int AudioSink::setConnectedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Connected", callback ? callback : connectedHandler);
}

int AudioSink::setDisconnectedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Disconnected", callback ? callback : disconnectedHandler);
}

int AudioSink::setPlayingHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Playing", callback ? callback : playingHandler);
}

int AudioSink::setStoppedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Stopped", callback ? callback : stoppedHandler);
}

void AudioSink::connectedHandler(RemoteObject* sender) {
    printLine({"Connected from ", sender->getPath()});
}

void AudioSink::disconnectedHandler(RemoteObject* sender) {
    printLine({"Disconnected from ", sender->getPath()});
}

void AudioSink::playingHandler(RemoteObject* sender) {
    printLine({"Playing in ", sender->getPath()});
}

void AudioSink::stoppedHandler(RemoteObject* sender) {
    printLine({"Stopped in ", sender->getPath()});
}

} // namespace Bluetooth
