// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/audio_stream.h"

#include "daemon/audio/adapter_media.h"
#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

#include <utility>

namespace Bluetooth::Sim {

AudioStream::AudioStream(DeviceAudio& audio, Direction direction)
    : AudioProfile(audio, direction == Direction::ToSink ? Interfaces::audioSink
                                                         : Interfaces::audioSource),
      m_direction(direction) {}

const Interface& AudioStream::table() const {
    return isSink() ? audioSinkInterface<AudioStream>() : audioSourceInterface<AudioStream>();
}

const MediaSide& AudioStream::ourSide() const {
    return isSink() ? MediaSides::streamSource : MediaSides::streamSink;
}

void AudioStream::enter(AudioState state) {
    if (state == this->state())
        return;
    const AudioState before = this->state();
    setState(state);
    if (isSink())
        m_audio.sinkChanged(before);
}

bool AudioStream::ready() const {
    return !m_settingUp && !m_disconnect && m_audio.device().adapter().mode().powered();
}

void AudioStream::connect(const CallPtr& call) {
    if (m_settingUp || m_disconnect)
        return call->fail(Errors::busy);
    if (m_open)
        return call->fail(Errors::alreadyConnected);
    if (!ready())
        return call->fail(Errors::failed("Failed to create a stream"));
    m_audio.connectOneOnly();
    begin(call);
}

void AudioStream::begin(const CallPtr& call) {
    m_connect = call;
    m_settingUp = true;
    if (disconnected())
        enter(AudioState::Connecting);
    const auto reached = [this] {
        const auto peer = m_audio.device().peer();
        if (peer && peer->connectsBack)
            authorize(fullUuid(advancedAudio), true, [this](bool allowed) { sessionUp(allowed); });
        else
            sessionUp(true);
    };
    reach(reached, [this] { nobodyThere(); });
}

void AudioStream::peerConnects(const std::string& uuid) {
    if (!disconnected())
        return;
    accept();
    enter(AudioState::Connecting);
    const auto setUp = [this] {
        if (isSink())
            m_audio.connectControlLater();
        open();
    };
    admit(uuid, setUp, [this] { failed(); });
}

void AudioStream::sessionUp(bool allowed) {
    if (!allowed)
        return failed();
    if (isSink())
        m_audio.connectControl();
    later(&Times::audioConnect, [this] { open(); });
}

void AudioStream::open() {
    const auto peer = m_audio.device().peer();
    if (peer && !peer->audioEndpoint)
        return failed();
    configure(
        ourSide(), [this](bool playing) { setPlaying(playing); },
        [this](bool configured) {
            if (configured)
                opened();
            else
                failed();
        });
}

void AudioStream::opened() {
    m_settingUp = false;
    m_open = true;
    if (const CallPtr call = std::exchange(m_connect, nullptr))
        call->reply();
    if (isSink() && state() == AudioState::Connecting) {
        emit("Connected");
        changed("Connected", true);
    }
    enter(AudioState::Connected);
}

void AudioStream::failed() {
    letGo();
    if (m_settingUp)
        answerLater();
    enter(AudioState::Disconnected);
}

void AudioStream::nobodyThere() {
    failed();
    // The end of the session is said after that of the attempt, though it never began.
    if (isSink()) {
        emit("Disconnected");
        changed("Connected", false);
    }
    setState(AudioState::Disconnected);
}

/// Two sides that connect to each other at once may yet succeed: Connect waits for that.
void AudioStream::answerLater() {
    const Times& times = m_audio.device().adapter().daemon().times();
    m_retry.start(times.scaled(times.audioRetry), [this] {
        m_settingUp = false;
        if (const CallPtr call = std::exchange(m_connect, nullptr))
            call->fail(Errors::failed("Stream setup failed"));
    });
}

void AudioStream::disconnect(const CallPtr& call) {
    if (m_audio.ending() && connected())
        return call->fail(Errors::failed("Invalid argument"));
    if (disconnected() || !(m_open || m_settingUp || m_disconnect))
        return call->fail(Errors::notConnected);
    if (m_settingUp || m_disconnect)
        return call->fail(Errors::busy);
    m_disconnect = call;
    later(&Times::audioShutdown, [this] {
        std::exchange(m_disconnect, nullptr)->reply();
        m_open = false;
        // The profile ends only with the session, which is kept for a while.
        later(&Times::audioClose, [this] { close(); });
    });
}

void AudioStream::close() {
    if (disconnected())
        return;
    if (const CallPtr call = std::exchange(m_disconnect, nullptr))
        call->reply();
    m_open = false;
    if (connected() && isSink()) {
        emit("Disconnected");
        changed("Connected", false);
    }
    failed();
    m_audio.device().adapter().media().clear(m_audio.device(), ourSide());
}

void AudioStream::cancel() {
    m_retry.stop();
    m_settingUp = false;
    if (const CallPtr call = std::exchange(m_connect, nullptr))
        call->fail(Errors::failed("Stream setup failed"));
    close();
}

void AudioStream::abandon() {
    m_retry.stop();
    AudioProfile::abandon();
}

void AudioStream::setPlaying(bool playing) {
    if (!m_open || playing == (state() == AudioState::Playing))
        return;
    if (isSink()) {
        emit(playing ? "Playing" : "Stopped");
        changed("Playing", playing);
    }
    enter(playing ? AudioState::Playing : AudioState::Connected);
}

void AudioStream::isConnected(const CallPtr& call) {
    call->reply(tuple(m_open));
}

void AudioStream::getProperties(const CallPtr& call) {
    DictBuilder properties;
    if (isSink())
        properties.add("Playing", state() == AudioState::Playing).add("Connected", m_open);
    call->reply(tuple(properties.add("State", textOf(state())).end()));
}

} // namespace Bluetooth::Sim
