// SPDX-License-Identifier: LGPL-2.1-or-later
#include "target.h"

#include "wakeup.h"

#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/commandlib.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>

#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <utility>

namespace AutoConnectd {

namespace {

using Bluetooth::Dict;

constexpr const char* audioSinkUuid = "0000110b-0000-1000-8000-00805f9b34fb";

std::string addressOf(const char* path) {
    const std::unique_ptr<char, decltype(&free)> address(Bluetooth::getAddressFromPath(path),
                                                         &free);
    return address ? address.get() : path;
}

bool hasSink(Bluetooth::Device& device) {
    const std::unique_ptr<Dict> properties(device.getProperties());
    return Bluetooth::find(properties.get(), "UUIDs").find(audioSinkUuid) != std::string::npos;
}

void onSinkChanged(Bluetooth::RemoteObject* /*sender*/) {
    tellConnection();
}

void onAudioChanged(Bluetooth::RemoteObject* /*sender*/, const char* /*name*/,
                    const Bluetooth::Variant* /*value*/) {
    tellConnection();
}

} // namespace

Target::Target(std::string path, std::string address, Pace pace)
    : m_path(std::move(path)), m_address(std::move(address)), m_pace(pace), m_delay(pace.first) {}

Target::~Target() = default;

std::unique_ptr<Target> Target::create(Bluetooth::Device& device, Pace pace) {
    const char* const path = device.getPath();
    std::unique_ptr<Target> target(new Target(path, addressOf(path), pace));
    if (hasSink(device)) {
        target->m_sink = std::make_unique<Bluetooth::AudioSink>(path);
        target->m_sink->setConnectedHandler(onSinkChanged);
        target->m_sink->setDisconnectedHandler(onSinkChanged);
    } else {
        target->m_audio = std::make_unique<Bluetooth::Audio>(path);
        target->m_audio->setPropertyChangedHandler(onAudioChanged);
    }
    bool connected = false;
    return target->queryConnected(connected) ? std::move(target) : nullptr;
}

void Target::wasTried(Clock::time_point when) {
    m_tried = when;
    m_due = when + m_pace.first;
}

bool Target::queryConnected(bool& connected) {
    if (m_sink)
        return m_sink->isConnected(connected) == 0;
    const std::unique_ptr<Dict> properties(m_audio->getProperties());
    connected = Bluetooth::find(properties.get(), "State") == "connected";
    return properties != nullptr;
}

bool Target::check(Clock::time_point now, bool mayConnect) {
    bool connected = false;
    if (!queryConnected(connected)) {
        if (m_connected)
            syslog(LOG_NOTICE, "%s is gone", m_address.c_str());
        return false;
    }
    if (connected != m_connected) {
        m_connected = connected;
        syslog(LOG_NOTICE, "%s %s", m_address.c_str(), connected ? "connected" : "disconnected");
        m_announced = false;
        m_delay = m_pace.first;
        m_due = now + m_delay;
    }
    if (!m_connected && mayConnect && now >= m_due)
        connect(now);
    return true;
}

void Target::connect(Clock::time_point now) {
    if (!m_announced)
        syslog(LOG_INFO, "connecting %s", m_address.c_str());
    m_announced = true;
    m_tried = now;
    // Whether it came to a connection is seen at the next check: the call does not wait for it.
    if (m_sink)
        m_sink->connect();
    else
        m_audio->connect();
    m_due = now + m_delay;
    m_delay = std::min(m_delay * 2, m_pace.longest);
}

void Target::hurry() {
    m_delay = m_pace.first;
    m_due = {};
}

void Target::beginAgain() {
    m_delay = m_pace.first;
    m_due = std::min(m_due, m_tried + m_pace.first);
}

} // namespace AutoConnectd
