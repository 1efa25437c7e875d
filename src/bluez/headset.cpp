// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/headset.h>

#include "bluez/factory.h"
#include "bluez/print.h"
#include "core/method_call.h"

namespace Bluetooth {

Headset::Headset(const char* path) : BluezObject(path, "org.bluez.Headset") {}

Headset::~Headset() {
    unsubscribeAll();
}

Headset* Headset::getHeadset(const char* path) {
    return makeProxy<Headset>(path);
}

int Headset::connect() {
    return callMethod(KES_HERE, *this, "Connect");
}

int Headset::disconnect() {
    return callMethod(KES_HERE, *this, "Disconnect");
}

int Headset::isConnected(bool& connected) {
    return readMethod(KES_HERE, *this, "IsConnected", connected) ? 0 : -1;
}

int Headset::indicateCall() {
    return callMethod(KES_HERE, *this, "IndicateCall");
}

int Headset::cancelCall() {
    return callMethod(KES_HERE, *this, "CancelCall");
}

int Headset::play() {
    return callMethod(KES_HERE, *this, "Play");
}

int Headset::stop() {
    return callMethod(KES_HERE, *this, "Stop");
}

int Headset::isPlaying(bool& playing) {
    return readMethod(KES_HERE, *this, "IsPlaying", playing) ? 0 : -1;
}

int Headset::getSpeakerGain(unsigned short& gain) {
    return readMethod(KES_HERE, *this, "GetSpeakerGain", gain) ? 0 : -1;
}

int Headset::getMicrophoneGain(unsigned short& gain) {
    return readMethod(KES_HERE, *this, "GetMicrophoneGain", gain) ? 0 : -1;
}

int Headset::setSpeakerGain(unsigned short gain) {
    return callMethod(KES_HERE, *this, "SetSpeakerGain", gain);
}

int Headset::setMicrophoneGain(unsigned short gain) {
    return callMethod(KES_HERE, *this, "SetMicrophoneGain", gain);
}

int Headset::setConnectedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Connected", callback ? callback : connectedHandler);
}

int Headset::setDisconnectedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Disconnected", callback ? callback : disconnectedHandler);
}

int Headset::setPlayingHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Playing", callback ? callback : playingHandler);
}

int Headset::setStoppedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("Stopped", callback ? callback : stoppedHandler);
}

int Headset::setAnswerRequestedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("AnswerRequested",
                                      callback ? callback : answerRequestedHandler);
}

int Headset::setCallTerminatedHandler(NoArgumentCallback callback) {
    return setSignalHandlerNoArgument("CallTerminated",
                                      callback ? callback : callTerminatedHandler);
}

void Headset::connectedHandler(RemoteObject* sender) {
    printLine({"Connected from ", sender->getPath()});
}

void Headset::disconnectedHandler(RemoteObject* sender) {
    printLine({"Disconnected from ", sender->getPath()});
}

void Headset::playingHandler(RemoteObject* sender) {
    printLine({"Playing in ", sender->getPath()});
}

void Headset::stoppedHandler(RemoteObject* sender) {
    printLine({"Stopped in ", sender->getPath()});
}

void Headset::answerRequestedHandler(RemoteObject* sender) {
    printLine({"Answer requested from ", sender->getPath()});
}

void Headset::callTerminatedHandler(RemoteObject* sender) {
    printLine({"Call terminated from ", sender->getPath()});
}

} // namespace Bluetooth
