// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/headset.h"

#include "daemon/audio/adapter_media.h"
#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bus/dict_builder.h"

#include <utility>

namespace Bluetooth::Sim {

namespace {

constexpr guint16 highestGain = 15;

} // namespace

Headset::Headset(DeviceAudio& audio) : AudioProfile(audio, Interfaces::headset) {}

/// The state's own signals, then what it means for all audio together.
void Headset::enter(AudioState state) {
    const AudioState before = this->state();
    setState(state);
    if (state == AudioState::Disconnected) {
        emit("Disconnected");
        if (before != AudioState::Connecting)
            changed("Connected", false);
    } else if (before == AudioState::Playing || state == AudioState::Playing) {
        emit(state == AudioState::Playing ? "Playing" : "Stopped");
        changed("Playing", state == AudioState::Playing);
    } else if (state == AudioState::Connected) {
        emit("Connected");
        changed("Connected", true);
    }
    m_audio.headsetChanged(before);
}

void Headset::connect(const CallPtr& call) {
    if (state() == AudioState::Connecting)
        return call->fail(Errors::inProgress);
    if (connected())
        return call->fail(Errors::alreadyConnected);
    if (!m_audio.device().adapter().mode().powered())
        return call->fail(Errors::failed("No route to host"));
    m_audio.connectOneOnly();
    begin(call);
}

void Headset::begin(const CallPtr& call) {
    m_connect = call;
    m_byPeer = false;
    enter(AudioState::Connecting);
    configure(
        MediaSides::voiceGateway, [this](bool playing) { setPlaying(playing); },
        [this](bool configured) {
            if (!configured)
                close();
        });
    reach([this] { later(&Times::audioConnect, [this] { opened(); }); }, [this] { close(); });
}

void Headset::peerConnects(const std::string& uuid) {
    if (!disconnected())
        return;
    m_byPeer = true;
    accept();
    enter(AudioState::Connecting);
    admit(
        uuid, [this] { opened(); }, [this] { close(); });
}

void Headset::opened() {
    m_speakerGain = highestGain;
    m_microphoneGain = highestGain;
    const CallPtr call = std::exchange(m_connect, nullptr);
    enter(AudioState::Connected);
    if (call)
        call->reply();
}

void Headset::close(guint Times::*idle) {
    if (disconnected())
        return;
    if (const CallPtr call = std::exchange(m_connect, nullptr))
        call->fail(Errors::failed("Connect failed"));
    letGo(idle);
    enter(AudioState::Disconnected);
    m_audio.device().adapter().media().clear(m_audio.device(), MediaSides::voiceGateway);
}

void Headset::disconnect(const CallPtr& call) {
    if (disconnected())
        return call->fail(Errors::notConnected);
    close();
    call->reply();
}

void Headset::isConnected(const CallPtr& call) {
    call->reply(tuple(connected()));
}

/// What CancelCall does as well: nobody is called who could tell.
void Headset::indicateCall(const CallPtr& call) {
    if (!connected())
        return call->fail(Errors::notConnected);
    call->reply();
}

void Headset::play(const CallPtr& call) {
    if (!m_audio.device().adapter().daemon().world().audio.scoByPcm)
        return call->fail(Errors::notAvailable);
    if (!connected())
        return call->fail(Errors::notConnected);
    if (state() == AudioState::Playing)
        return call->fail(Errors::alreadyConnected);
    call->reply();
    setPlaying(true);
}

void Headset::stop(const CallPtr& call) {
    if (state() != AudioState::Playing)
        return call->fail(Errors::notConnected);
    setPlaying(false);
    call->reply();
}

void Headset::setPlaying(bool playing) {
    if (connected() && playing != (state() == AudioState::Playing))
        enter(playing ? AudioState::Playing : AudioState::Connected);
}

void Headset::isPlaying(const CallPtr& call) {
    call->reply(tuple(state() == AudioState::Playing));
}

void Headset::answerGain(const CallPtr& call, guint16 gain) {
    if (!connected())
        return call->fail(Errors::notAvailable);
    call->reply(tuple(gain));
}

void Headset::getSpeakerGain(const CallPtr& call) {
    answerGain(call, m_speakerGain);
}

void Headset::getMicrophoneGain(const CallPtr& call) {
    answerGain(call, m_microphoneGain);
}

bool Headset::setGain(const std::string& name, guint16 gain) {
    const bool isSpeaker = name == "SpeakerGain";
    guint16& present = isSpeaker ? m_speakerGain : m_microphoneGain;
    if ((!isSpeaker && name != "MicrophoneGain") || gain > highestGain || gain == present)
        return false;
    present = gain;
    emit((name + "Changed").c_str(), tuple(gain));
    changed(name.c_str(), gain);
    return true;
}

void Headset::changeGain(const CallPtr& call, const std::string& name, const Value& gain) {
    if (!gain.is("q"))
        return call->fail(Errors::invalidArguments);
    if (!connected())
        return call->fail(Errors::notConnected);
    if (!setGain(name, g_variant_get_uint16(gain.get())))
        return call->fail(Errors::invalidArguments);
    call->reply();
}

void Headset::setSpeakerGain(const CallPtr& call) {
    changeGain(call, "SpeakerGain", call->argument(0));
}

void Headset::setMicrophoneGain(const CallPtr& call) {
    changeGain(call, "MicrophoneGain", call->argument(0));
}

void Headset::setProperty(const CallPtr& call) {
    changeGain(call, call->text(0), call->content(1));
}

void Headset::getProperties(const CallPtr& call) {
    DictBuilder properties;
    properties.add("Playing", state() == AudioState::Playing)
        .add("State", textOf(state()))
        .add("Connected", connected());
    if (connected())
        properties.add("SpeakerGain", m_speakerGain).add("MicrophoneGain", m_microphoneGain);
    call->reply(tuple(properties.end()));
}

} // namespace Bluetooth::Sim
