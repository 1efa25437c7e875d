// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_audio.h"

#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr const char* headset = "1108";
constexpr const char* audioSource = "110a";
constexpr const char* audioSink = "110b";
constexpr const char* remoteTarget = "110c";
constexpr const char* advancedAudio = "110d";
constexpr const char* remoteControl = "110e";
constexpr const char* headsetGateway = "1112";
constexpr const char* handsFree = "111e";
constexpr const char* handsFreeGateway = "111f";

} // namespace

const char* DeviceAudio::text(State state) {
    switch (state) {
    case State::Connecting:
        return "connecting";
    case State::Connected:
        return "connected";
    case State::Playing:
        return "playing";
    default:
        return "disconnected";
    }
}

bool DeviceAudio::has(const char* uuid) const {
    const auto& uuids = m_device.stored().uuids;
    return std::find(uuids.begin(), uuids.end(), fullUuid(uuid)) != uuids.end();
}

void DeviceAudio::serve() {
    ObjectTree& objects = m_device.adapter().daemon().objects();
    const bool sink = has(audioSink);
    const bool control = has(remoteTarget) || has(remoteControl);
    const bool audio = sink || control || has(headset) || has(handsFree) || has(audioSource) ||
                       has(headsetGateway) || has(handsFreeGateway);
    const auto add = [&](bool wanted, bool& served, const Interface& table) {
        if (wanted && !served)
            objects.add(m_device.path(), table, this);
        served = served || wanted;
    };
    add(audio, m_audioServed, audioInterface<DeviceAudio>());
    add(sink, m_sinkServed, audioSinkInterface<DeviceAudio>());
    add(control, m_controlServed, remoteControlInterface<DeviceAudio>());
}

void DeviceAudio::emit(const char* interface, const char* member, const Value& arguments) {
    m_device.adapter().daemon().bus().emit(m_device.path(), interface, member, arguments);
}

void DeviceAudio::changed(const char* interface, const char* property, const Value& value) {
    emit(interface, "PropertyChanged", propertyChange(property, value));
}

void DeviceAudio::setSink(State state) {
    if (!m_sinkServed || m_sink == state)
        return;
    m_sink = state;
    changed(Interfaces::audioSink, "State", text(state));
}

void DeviceAudio::setAudio(State state) {
    if (m_audio == state)
        return;
    m_audio = state;
    // Audio answers before it says so, AudioSink after.
    if (state != State::Connecting && m_audioCall) {
        if (state == State::Connected)
            m_audioCall->reply();
        else
            m_audioCall->fail(Errors::failed("Connect Failed"));
        m_audioCall.reset();
    }
    changed(Interfaces::audio, "State", text(state));
}

void DeviceAudio::setControl(bool connected) {
    m_controlSetUp.stop();
    if (!m_controlServed || m_control == connected)
        return;
    m_control = connected;
    emit(Interfaces::control, connected ? "Connected" : "Disconnected");
    changed(Interfaces::control, "Connected", connected);
}

void DeviceAudio::connectAudio(const CallPtr& call) {
    if (m_audio == State::Connecting)
        return call->fail(Errors::inProgress);
    if (m_audio == State::Connected)
        return call->fail(Errors::alreadyConnected);
    if (!m_sinkServed && !has(headset) && !has(handsFree))
        return call->fail(Errors::failed("Connect Failed"));
    m_audioCall = call;
    beginConnecting();
}

void DeviceAudio::connectSink(const CallPtr& call) {
    if (m_sink == State::Connecting)
        return call->fail(Errors::inProgress);
    if (m_sink != State::Disconnected)
        return call->fail(Errors::alreadyConnected);
    m_sinkCall = call;
    beginConnecting();
}

void DeviceAudio::beginConnecting() {
    setSink(State::Connecting);
    setAudio(State::Connecting);
    m_hold = m_device.link().hold();
    if (!m_device.adapter().mode().powered())
        return failed();
    m_device.link().connect([this](bool reached) {
        if (reached)
            linkReached();
        else
            failed();
    });
}

void DeviceAudio::linkReached() {
    const auto peer = m_device.peer();
    if (peer && peer->connectsBack)
        authorize(fullUuid(advancedAudio));
    else
        setUpStream();
}

void DeviceAudio::serviceConnects(const std::string& uuid) {
    if (m_sink != State::Disconnected || m_audio != State::Disconnected)
        return;
    if (!m_device.link().up())
        m_device.comeIn(false);
    m_hold = m_device.link().hold();
    setSink(State::Connecting);
    setAudio(State::Connecting);
    authorize(uuid);
}

void DeviceAudio::authorize(const std::string& uuid) {
    ClientAgent* agent = m_device.adapter().agent();
    // With nobody to ask, a channel that we opened as well is taken as wanted.
    const bool wanted = m_sinkCall || m_audioCall;
    if (m_device.stored().trusted || (!agent && wanted))
        return setUpStream();
    if (!agent || agent->busy())
        return failed();
    const auto& times = m_device.adapter().daemon().times();
    const auto device = m_device.weak_from_this();
    agent->ask("Authorize", tuple(pathValue(m_device.path()), uuid), "", times.agentTimeout,
               [this, device](const CallResult& answer) {
                   const auto alive = device.lock();
                   if (!alive || m_sink == State::Connected ||
                       (m_audio != State::Connecting && m_sink != State::Connecting))
                       return;
                   if (answer.failed)
                       failed();
                   else
                       setUpStream();
               });
}

void DeviceAudio::setUpStream() {
    const Times& times = m_device.adapter().daemon().times();
    m_setUp.start(times.scaled(times.audioConnect), [this] { connected(); });
}

void DeviceAudio::connected() {
    const Times& times = m_device.adapter().daemon().times();
    if (m_sinkServed) {
        emit(Interfaces::audioSink, "Connected");
        changed(Interfaces::audioSink, "Connected", true);
        setSink(State::Connected);
    }
    setAudio(State::Connected);
    if (m_sinkCall)
        m_sinkCall->reply();
    m_sinkCall.reset();
    if (m_controlServed)
        m_controlSetUp.start(times.scaled(times.controlConnect), [this] { setControl(true); });
}

void DeviceAudio::failed() {
    m_setUp.stop();
    if (m_sinkCall)
        m_sinkCall->fail(Errors::failed("Stream setup failed"));
    m_sinkCall.reset();
    setSink(State::Disconnected);
    setAudio(State::Disconnected);
    m_hold.release();
}

void DeviceAudio::disconnected() {
    setPlaying(false);
    setControl(false);
    if (m_sink == State::Connected) {
        emit(Interfaces::audioSink, "Disconnected");
        changed(Interfaces::audioSink, "Connected", false);
    }
    failed();
}

void DeviceAudio::disconnectAudio(const CallPtr& call) {
    if (m_audio == State::Disconnected)
        return call->fail(Errors::notConnected);
    disconnected();
    call->reply();
}

void DeviceAudio::disconnectSink(const CallPtr& call) {
    if (m_sink == State::Disconnected)
        return call->fail(Errors::notConnected);
    if (m_sink == State::Connecting)
        return call->fail(Errors::inProgress);
    disconnected();
    call->reply();
}

void DeviceAudio::setPlaying(bool playing) {
    if (m_sink != (playing ? State::Connected : State::Playing))
        return;
    emit(Interfaces::audioSink, playing ? "Playing" : "Stopped");
    changed(Interfaces::audioSink, "Playing", playing);
    setSink(playing ? State::Playing : State::Connected);
}

void DeviceAudio::linkLost() {
    if (m_audio != State::Disconnected || m_sink != State::Disconnected)
        disconnected();
}

void DeviceAudio::abandon() {
    m_setUp.stop();
    m_controlSetUp.stop();
    m_audioCall.reset();
    m_sinkCall.reset();
    m_hold.release();
}

void DeviceAudio::audioProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("State", text(m_audio)).end()));
}

void DeviceAudio::sinkIsConnected(const CallPtr& call) {
    call->reply(tuple(m_sink == State::Connected || m_sink == State::Playing));
}

void DeviceAudio::sinkProperties(const CallPtr& call) {
    const bool connected = m_sink == State::Connected || m_sink == State::Playing;
    call->reply(tuple(DictBuilder()
                          .add("State", text(m_sink))
                          .add("Connected", connected)
                          .add("Playing", m_sink == State::Playing)
                          .end()));
}

void DeviceAudio::controlIsConnected(const CallPtr& call) {
    call->reply(tuple(m_control));
}

void DeviceAudio::controlProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("Connected", m_control).end()));
}

void DeviceAudio::volume(const CallPtr& call) {
    if (!m_control)
        return call->fail(Errors::notConnected);
    call->reply();
}

} // namespace Bluetooth::Sim
