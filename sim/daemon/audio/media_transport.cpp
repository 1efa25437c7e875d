// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/media_transport.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

#include <sys/socket.h>

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr guint16 mtu = 672;
constexpr guint16 loudest = 127;

std::string nextPath(const ServedDevice& device) {
    static unsigned count = 0; // transports are numbered for all devices together
    return device.path() + "/fd" + std::to_string(count++);
}

} // namespace

MediaTransport::MediaTransport(ServedDevice& device, Format format, std::function<void(bool)> play)
    : m_device(device),
      m_format(std::move(format)),
      m_play(std::move(play)),
      m_path(nextPath(device)) {
    m_device.adapter().daemon().objects().add(m_path, mediaTransportInterface<MediaTransport>(),
                                              this);
}

MediaTransport::~MediaTransport() {
    m_device.adapter().daemon().objects().remove(m_path);
    if (!m_owners.empty())
        m_play(false);
}

Value MediaTransport::properties() const {
    DictBuilder properties;
    properties.add("Device", pathValue(m_device.path()))
        .add("UUID", m_format.uuid)
        .add("Codec", m_format.codec)
        .add("Configuration", m_format.configuration);
    if (m_format.kind == MediaSide::Kind::Stream)
        return properties.add("Delay", m_delay).add("Volume", m_volume).end();
    if (m_format.kind == MediaSide::Kind::Headset)
        return properties.end();
    const bool byPcm = m_device.adapter().daemon().world().audio.scoByPcm;
    return properties.add("NREC", true)
        .add("InbandRingtone", true)
        .add("Routing", byPcm ? "PCM" : "HCI")
        .end();
}

void MediaTransport::getProperties(const CallPtr& call) {
    call->reply(tuple(properties()));
}

bool MediaTransport::held(char access) const {
    return std::any_of(m_owners.begin(), m_owners.end(), [&](const auto& owner) {
        return owner.second.find(access) != std::string::npos;
    });
}

void MediaTransport::acquire(const CallPtr& call) {
    const std::string access = call->text(0);
    const bool reads = access.find('r') != std::string::npos;
    const bool writes = access.find('w') != std::string::npos;
    if (m_owners.count(call->sender()) != 0 || !(reads || writes) || (reads && held('r')) ||
        (writes && held('w')))
        return call->fail(Errors::notAuthorized);
    if (!m_socket)
        m_socket = std::make_unique<MediaSocket>(SOCK_SEQPACKET);
    m_owners[call->sender()] = access;
    call->replyDescriptor(m_socket->clientEnd(),
                          {reads ? mtu : guint16{0}, writes ? mtu : guint16{0}});
    m_play(true);
}

void MediaTransport::release(const CallPtr& call) {
    const std::string access = call->text(0);
    const auto owner = m_owners.find(call->sender());
    if (owner == m_owners.end() || owner->second.find(access) == std::string::npos)
        return call->fail(Errors::notAuthorized);
    if (owner->second == access)
        drop(owner->first);
    else
        for (const char given : access)
            std::replace(owner->second.begin(), owner->second.end(), given, ' ');
    call->reply();
}

void MediaTransport::drop(const std::string& owner) {
    if (m_owners.erase(std::string(owner)) == 0 || !m_owners.empty())
        return;
    m_socket.reset();
    m_play(false);
}

void MediaTransport::setProperty(const CallPtr& call) {
    const bool answered = m_format.kind == MediaSide::Kind::Stream &&
                          m_owners.count(call->sender()) != 0 &&
                          setOneOf({{"Delay", "q", &MediaTransport::setDelay},
                                    {"Volume", "q", &MediaTransport::setVolume}},
                                   *this, call);
    if (!answered)
        call->fail(Errors::invalidArguments);
}

void MediaTransport::setDelay(const CallPtr& call, const Value& value) {
    m_delay = g_variant_get_uint16(value.get());
    call->reply();
}

void MediaTransport::setVolume(const CallPtr& call, const Value& value) {
    const guint16 volume = g_variant_get_uint16(value.get());
    if (volume > loudest)
        return call->fail(Errors::invalidArguments);
    call->reply();
    if (m_volume == volume)
        return;
    m_volume = volume; // the device confirms it
    m_device.adapter().daemon().bus().emit(m_path, Interfaces::mediaTransport, "PropertyChanged",
                                           propertyChange("Volume", value));
}

} // namespace Bluetooth::Sim
