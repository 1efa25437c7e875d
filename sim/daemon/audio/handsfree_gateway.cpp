// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/handsfree_gateway.h"

#include "daemon/audio/adapter_media.h"
#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bus/dict_builder.h"

#include <sys/socket.h>

#include <utility>

namespace Bluetooth::Sim {

namespace {

constexpr guint16 handsFreeVersion = 0x0105;

} // namespace

HandsfreeGateway::HandsfreeGateway(DeviceAudio& audio)
    : AudioProfile(audio, Interfaces::handsfreeGateway) {}

void HandsfreeGateway::enter(AudioState state) {
    if (state == this->state())
        return;
    setState(state);
    if (state == AudioState::Connecting)
        configure(
            MediaSides::voiceHeadset, [this](bool playing) { setPlaying(playing); },
            [this](bool configured) {
                if (!configured)
                    close();
            });
}

void HandsfreeGateway::connect(const CallPtr& call) {
    if (!m_agent)
        return call->fail(Errors::agentNotAvailable);
    if (state() == AudioState::Connecting)
        return call->fail(Errors::inProgress);
    if (connected())
        return call->fail(Errors::alreadyConnected);
    if (!m_audio.device().adapter().mode().powered())
        return call->fail(Errors::failed("No route to host"));
    m_connect = call;
    enter(AudioState::Connecting);
    reach([this] { later(&Times::audioConnect, [this] { opened(); }); }, [this] { close(); });
}

void HandsfreeGateway::peerConnects(const std::string& uuid) {
    if (!disconnected())
        return;
    accept();
    enter(AudioState::Connecting);
    admit(
        uuid, [this] { opened(); }, [this] { close(); });
}

/// The agent is given the connection; that it stands is said when the agent has answered.
void HandsfreeGateway::opened() {
    if (!m_agent)
        return close();
    ServedDevice& device = m_audio.device();
    m_socket = std::make_unique<MediaSocket>(SOCK_STREAM);
    const auto answered = [this](bool taken) {
        if (taken)
            enter(AudioState::Connected);
        else
            close();
    };
    device.adapter().daemon().bus().call(
        m_agent->owner, m_agent->path, Interfaces::handsfreeAgent, "NewConnection",
        g_variant_new("(hq)", 0, handsFreeVersion), -1, nullptr,
        [alive = device.weak_from_this(),
         then = ofThisAttempt(answered)](const CallResult& answer) {
            if (!alive.expired())
                then(!answer.failed);
        },
        m_socket->clientEnd());
    if (const CallPtr call = std::exchange(m_connect, nullptr))
        call->reply();
}

void HandsfreeGateway::close(guint Times::*idle) {
    if (disconnected())
        return;
    if (const CallPtr call = std::exchange(m_connect, nullptr))
        call->fail(Errors::failed("Connect failed"));
    m_socket.reset();
    letGo(idle);
    enter(AudioState::Disconnected);
    m_audio.device().adapter().media().clear(m_audio.device(), MediaSides::voiceHeadset);
}

void HandsfreeGateway::disconnect(const CallPtr& call) {
    if (!m_socket)
        return call->fail(Errors::notConnected);
    close();
    call->reply();
}

void HandsfreeGateway::setPlaying(bool playing) {
    if (connected())
        enter(playing ? AudioState::Playing : AudioState::Connected);
}

void HandsfreeGateway::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("State", textOf(state())).end()));
}

void HandsfreeGateway::registerAgent(const CallPtr& call) {
    if (m_agent)
        return call->fail(Errors::alreadyExists);
    m_agent = Agent{call->sender(), call->text(0)};
    call->reply();
}

void HandsfreeGateway::unregisterAgent(const CallPtr& call) {
    if (m_agent && m_agent->owner != call->sender())
        return call->fail(Errors::notAuthorized);
    if (m_agent && m_agent->path != call->text(0))
        return call->fail(Errors::doesNotExist);
    m_agent.reset();
    call->reply();
}

void HandsfreeGateway::clientGone(const std::string& client) {
    if (m_agent && m_agent->owner == client)
        m_agent.reset();
}

void HandsfreeGateway::releaseAgent() {
    if (m_agent)
        m_audio.device().adapter().daemon().bus().send(m_agent->owner, m_agent->path,
                                                       Interfaces::handsfreeAgent, "Release");
    m_agent.reset();
}

void HandsfreeGateway::abandon() {
    m_socket.reset();
    AudioProfile::abandon();
}

} // namespace Bluetooth::Sim
