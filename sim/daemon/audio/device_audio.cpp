// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/device_audio.h"

#include "daemon/audio/adapter_media.h"
#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

namespace Bluetooth::Sim {

namespace {

constexpr const char* headsetClass = "1108";
constexpr const char* audioSource = "110a";
constexpr const char* audioSink = "110b";
constexpr const char* remoteControl = "110e";
constexpr const char* headsetGateway = "1112";
constexpr const char* handsFree = "111e";
constexpr const char* handsFreeGateway = "111f";

bool isOneOf(const std::string& uuid, std::initializer_list<const char*> classes) {
    return std::any_of(classes.begin(), classes.end(),
                       [&](const char* known) { return fullUuid(known) == uuid; });
}

} // namespace

bool DeviceAudio::has(const char* uuid) const {
    const auto& uuids = m_device.stored().uuids;
    return std::find(uuids.begin(), uuids.end(), fullUuid(uuid)) != uuids.end();
}

void DeviceAudio::serve() {
    const AudioConfiguration& enabled = m_device.adapter().daemon().world().audio;
    ObjectTree& objects = m_device.adapter().daemon().objects();
    using Direction = AudioStream::Direction;
    const auto add = [&](bool wanted, auto& profile, auto make, const auto& table) {
        if (!wanted || profile)
            return;
        profile = make();
        objects.add(m_device.path(), table(*profile), profile.get());
    };
    const auto streamTable = [](const AudioStream& s) -> const Interface& { return s.table(); };
    const bool isHeadset = has(headsetClass) || has(handsFree);
    const bool isControl = has(remoteTarget) || has(remoteControl);
    const bool isAudio = isHeadset || isControl || has(audioSink) || has(audioSource) ||
                         has(advancedAudio) || has(headsetGateway) || has(handsFreeGateway);
    if (isAudio && !std::exchange(m_served, isAudio))
        objects.add(m_device.path(), audioInterface<DeviceAudio>(), this);
    add(
        isHeadset, m_headset, [&] { return std::make_unique<Headset>(*this); },
        [](const auto&) -> const Interface& { return headsetInterface<Headset>(); });
    add(
        enabled.gateway && has(handsFreeGateway), m_gateway,
        [&] { return std::make_unique<HandsfreeGateway>(*this); },
        [](const auto&) -> const Interface& {
            return handsfreeGatewayInterface<HandsfreeGateway>();
        });
    add(
        has(audioSink), m_sink,
        [&] { return std::make_unique<AudioStream>(*this, Direction::ToSink); }, streamTable);
    add(
        enabled.source && has(audioSource), m_source,
        [&] { return std::make_unique<AudioStream>(*this, Direction::FromSource); }, streamTable);
    add(
        isControl, m_control, [&] { return std::make_unique<RemoteControl>(*this); },
        [](const auto&) -> const Interface& { return remoteControlInterface<RemoteControl>(); });
}

void DeviceAudio::emit(const char* interface, const char* member, const Value& arguments) {
    m_device.adapter().daemon().bus().emit(m_device.path(), interface, member, arguments);
}

AudioState DeviceAudio::sinkState() const {
    return m_sink ? m_sink->state() : AudioState::Disconnected;
}

AudioState DeviceAudio::headsetState() const {
    return m_headset ? m_headset->state() : AudioState::Disconnected;
}

void DeviceAudio::enter(AudioState state) {
    if (state == AudioState::Disconnected) {
        stopAsking();
        m_authorized = false;
        m_ending = false;
        m_shutdown.stop();
    }
    if (state == m_state)
        return;
    m_state = state;
    if (state == AudioState::Disconnected && m_disconnect)
        std::exchange(m_disconnect, nullptr)->reply();
    if (const CallPtr call =
            state == AudioState::Connecting ? nullptr : std::exchange(m_connect, nullptr)) {
        if (state == AudioState::Connected)
            call->reply();
        else
            call->fail(Errors::failed("Connect Failed"));
    }
    emit(Interfaces::audio, "PropertyChanged", propertyChange("State", textOf(state)));
}

void DeviceAudio::sinkChanged(AudioState before) {
    const Times& times = m_device.adapter().daemon().times();
    const AudioState other = headsetState();
    switch (sinkState()) {
    case AudioState::Disconnected:
        m_headsetPause.stop();
        if (m_control)
            m_control->disconnect();
        if (other == AudioState::Disconnected)
            enter(AudioState::Disconnected);
        else if (m_ending)
            m_headset->close();
        else if (before == AudioState::Connecting && other >= AudioState::Connected)
            enter(AudioState::Connected);
        break;
    case AudioState::Connecting:
        m_sinkPause.stop();
        if (other == AudioState::Disconnected)
            enter(AudioState::Connecting);
        break;
    case AudioState::Connected:
        if (before == AudioState::Playing)
            break;
        if (m_connectAll && m_headset && other == AudioState::Disconnected)
            m_headsetPause.start(times.scaled(times.audioPause), [this] { m_headset->begin({}); });
        else if (m_connectAll ? other != AudioState::Connecting : other < AudioState::Connected)
            enter(AudioState::Connected);
        break;
    default:
        break;
    }
}

void DeviceAudio::headsetChanged(AudioState before) {
    const Times& times = m_device.adapter().daemon().times();
    const AudioState other = sinkState();
    switch (headsetState()) {
    case AudioState::Disconnected:
        m_sinkPause.stop();
        if (other == AudioState::Disconnected)
            enter(AudioState::Disconnected);
        else if (m_ending)
            shutDownSink();
        else if (before == AudioState::Connecting && other >= AudioState::Connected)
            enter(AudioState::Connected);
        break;
    case AudioState::Connecting:
        m_headsetPause.stop();
        if (other == AudioState::Disconnected)
            enter(AudioState::Connecting);
        break;
    case AudioState::Connected:
        if (before >= AudioState::Connected)
            break;
        if (m_connectAll && m_sink && other == AudioState::Disconnected)
            // A headset that has connected gets longer to connect its stream as well.
            m_sinkPause.start(times.scaled(times.audioPause * (m_headset->byPeer() ? 2U : 1U)),
                              [this] {
                                  if (m_sink->ready())
                                      m_sink->begin({});
                              });
        else if (m_connectAll ? other != AudioState::Connecting : other < AudioState::Connected)
            enter(AudioState::Connected);
        break;
    default:
        break;
    }
}

void DeviceAudio::connect(const CallPtr& call) {
    if (m_state == AudioState::Connecting)
        return call->fail(Errors::inProgress);
    if (m_state == AudioState::Connected)
        return call->fail(Errors::alreadyConnected);
    m_connectAll = true;
    if (m_device.adapter().mode().powered()) {
        if (m_headset)
            m_headset->begin({});
        if (m_state != AudioState::Connecting && m_sink && m_sink->ready())
            m_sink->begin({});
    }
    if (m_state != AudioState::Connecting)
        return call->fail(Errors::failed("Connect Failed"));
    m_connect = call;
}

void DeviceAudio::disconnect(const CallPtr& call) {
    if (m_state == AudioState::Disconnected)
        return call->fail(Errors::notConnected);
    if (m_ending)
        return call->reply();
    m_disconnect = call;
    disconnectRequested();
}

void DeviceAudio::disconnectRequested() {
    if (m_state == AudioState::Disconnected || m_ending)
        return;
    m_ending = true;
    m_sinkPause.stop();
    m_headsetPause.stop();
    if (m_control)
        m_control->disconnect();
    if (sinkState() != AudioState::Disconnected)
        shutDownSink();
    else
        m_headset->close();
}

void DeviceAudio::shutDownSink() {
    if (sinkState() == AudioState::Connecting)
        return m_sink->cancel();
    const Times& times = m_device.adapter().daemon().times();
    m_shutdown.start(times.scaled(times.audioShutdown), [this] {
        if (const CallPtr call = std::exchange(m_disconnect, nullptr))
            call->reply();
        m_sink->close();
    });
}

void DeviceAudio::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("State", textOf(m_state)).end()));
}

void DeviceAudio::connectControl() {
    if (m_control)
        m_control->connect();
}

void DeviceAudio::connectControlLater() {
    if (m_control)
        m_control->connectLater();
}

void DeviceAudio::authorize(const std::string& uuid, bool wanted,
                            const std::function<void(bool)>& done) {
    ClientAgent* agent = m_device.adapter().agent();
    if (m_device.stored().trusted || m_authorized || (!agent && wanted))
        return done(true);
    if (!agent || agent->busy())
        return done(false);
    const Times& times = m_device.adapter().daemon().times();
    m_asking = true;
    agent->ask("Authorize", tuple(pathValue(m_device.path()), uuid), "", times.agentTimeout,
               [this, alive = m_device.weak_from_this(), done](const CallResult& answer) {
                   if (alive.expired())
                       return;
                   m_asking = false;
                   m_authorized = !answer.failed;
                   done(!answer.failed);
               });
}

void DeviceAudio::stopAsking() {
    ClientAgent* agent = m_device.adapter().agent();
    if (std::exchange(m_asking, false) && agent)
        agent->cancel();
}

template <class Action>
void DeviceAudio::atService(const std::string& uuid, const Action& action) {
    const bool isVoice = isOneOf(uuid, {headsetClass, handsFree, headsetGateway, handsFreeGateway});
    const bool isControl = isOneOf(uuid, {remoteTarget, remoteControl});
    if (isControl && m_control)
        action(*m_control);
    else if (isVoice && m_headset)
        action(*m_headset);
    else if (isVoice && m_gateway)
        action(*m_gateway);
    else if (isOneOf(uuid, {audioSource, audioSink, advancedAudio}) && (m_sink || m_source))
        action(m_sink ? *m_sink : *m_source);
    else
        throw std::runtime_error("the device has no such service");
}

void DeviceAudio::serviceConnects(const std::string& uuid) {
    atService(uuid, [&](auto& profile) { profile.peerConnects(uuid); });
}

void DeviceAudio::serviceDisconnects(const std::string& uuid) {
    atService(uuid, [](auto& profile) { profile.peerCloses(); });
}

void DeviceAudio::setPlaying(bool playing) {
    const auto set = [&](const auto& profile) {
        if (!profile || !profile->connected())
            return false;
        profile->setPlaying(playing);
        return true;
    };
    set(m_sink) || set(m_source) || set(m_headset) || set(m_gateway);
}

void DeviceAudio::linkLost() {
    // With the power all is said that the adapter has to say, then what the profiles have.
    if (m_device.adapter().mode().powered())
        allLost();
    else
        m_lost.start(0, [this] { allLost(); });
}

void DeviceAudio::allLost() {
    stopAsking();
    m_lost.stop();
    m_sinkPause.stop();
    m_headsetPause.stop();
    m_shutdown.stop();
    if (m_control)
        m_control->disconnect();
    if (m_sink)
        m_sink->close();
    if (m_source)
        m_source->close();
    if (m_headset)
        m_headset->close();
    if (m_gateway)
        m_gateway->close();
}

void DeviceAudio::clientGone(const std::string& client) {
    if (m_gateway)
        m_gateway->clientGone(client);
}

void DeviceAudio::releaseAgent() {
    if (m_gateway)
        m_gateway->releaseAgent();
}

void DeviceAudio::abandon() {
    m_connect.reset();
    m_disconnect.reset();
    for (OneShotTimer* timer : {&m_sinkPause, &m_headsetPause, &m_shutdown, &m_lost})
        timer->stop();
    const auto abandon = [](const auto& profile) {
        if (profile)
            profile->abandon();
    };
    abandon(m_sink);
    abandon(m_source);
    abandon(m_headset);
    abandon(m_gateway);
    abandon(m_control);
    m_device.adapter().media().forget(m_device);
}

} // namespace Bluetooth::Sim
