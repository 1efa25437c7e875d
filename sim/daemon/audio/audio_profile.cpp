// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/audio_profile.h"

#include "daemon/audio/adapter_media.h"
#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/properties.h"

namespace Bluetooth::Sim {

const char* textOf(AudioState state) {
    switch (state) {
    case AudioState::Connecting:
        return "connecting";
    case AudioState::Connected:
        return "connected";
    case AudioState::Playing:
        return "playing";
    default:
        return "disconnected";
    }
}

void AudioProfile::emit(const char* member, const Value& arguments) {
    m_audio.emit(m_interface, member, arguments);
}

void AudioProfile::changed(const char* property, const Value& value) {
    emit("PropertyChanged", propertyChange(property, value));
}

void AudioProfile::setState(AudioState state) {
    m_state = state;
    changed("State", textOf(state));
}

std::function<void(bool)> AudioProfile::ofThisAttempt(std::function<void(bool)> action) {
    return [this, attempt = m_attempt, action = std::move(action)](bool result) {
        if (attempt == m_attempt)
            action(result);
    };
}

void AudioProfile::reach(const std::function<void()>& reached,
                         const std::function<void()>& failed) {
    const auto end = ofThisAttempt([this, reached, failed](bool up) {
        const auto peer = m_audio.device().peer();
        if (!up)
            failed();
        else if (peer && peer->audioHangs)
            later(&Times::audioTimeout, failed);
        else
            reached();
    });
    Link& link = m_audio.device().link();
    if (m_paging++ == 0)
        m_hold = link.hold();
    link.connect(m_hold, [this, end](bool up) {
        --m_paging;
        end(up);
        if (disconnected())
            m_hold.release(&Times::audioIdle); // nobody wants the link any more
    });
}

void AudioProfile::accept() {
    Link& link = m_audio.device().link();
    if (!link.up())
        link.accept(false);
    m_hold = link.hold();
}

void AudioProfile::authorize(const std::string& uuid, bool wanted, std::function<void(bool)> done) {
    m_audio.authorize(uuid, wanted, ofThisAttempt(std::move(done)));
}

void AudioProfile::admit(const std::string& uuid, std::function<void()> opened,
                         std::function<void()> refused) {
    authorize(uuid, false,
              [this, opened = std::move(opened), refused = std::move(refused)](bool allowed) {
                  if (allowed)
                      later(&Times::audioConnect, opened);
                  else
                      refused();
              });
}

void AudioProfile::configure(const MediaSide& side, const std::function<void(bool)>& play,
                             std::function<void(bool)> done) {
    m_audio.device().adapter().media().configure(m_audio.device(), side, play,
                                                 ofThisAttempt(std::move(done)));
}

void AudioProfile::later(guint Times::*time, std::function<void()> action) {
    const Times& times = m_audio.device().adapter().daemon().times();
    m_timer.start(times.scaled(times.*time), std::move(action));
}

void AudioProfile::letGo(guint Times::*idle) {
    m_timer.stop();
    ++m_attempt;
    // A link that is still on its way up is let go of when it is there.
    if (m_paging == 0)
        m_hold.release(idle);
}

void AudioProfile::abandon() {
    m_timer.stop();
    ++m_attempt;
    m_hold.release();
}

} // namespace Bluetooth::Sim
