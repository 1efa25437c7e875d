// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/channel.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"

#include <algorithm>

namespace Bluetooth::Sim {

void Channel::open(const Target& target, OnEnd onEnd) {
    m_state = State::Opening;
    m_onEnd = std::move(onEnd);
    m_hold = m_device.link().hold();
    if (!m_device.adapter().mode().powered())
        return end(target.off);
    m_device.link().connect(m_hold, [this, target](bool up) {
        if (up)
            reached(target);
        else
            end(target.notThere);
    });
}

void Channel::reached(const Target& target) {
    const Times& times = m_device.adapter().daemon().times();
    const guint duration = times.channelConnect + (target.searched ? times.serviceSearch : 0);
    m_timer.start(times.scaled(duration), [this, target] {
        const auto peer = m_device.peer();
        const auto in = [&](const std::vector<std::string>& uuids) {
            return std::find(uuids.begin(), uuids.end(), target.uuid) != uuids.end();
        };
        if (target.searched && !(peer && in(peer->uuids)))
            return end("No record found");
        end(peer && in(peer->uuids) && !in(peer->refuses) ? nullptr : "Connection refused (111)");
    });
}

void Channel::accept() {
    m_state = State::Open;
    m_hold = m_device.link().hold();
}

void Channel::end(const char* failure) {
    const OnEnd onEnd = std::move(m_onEnd);
    if (failure)
        close();
    else
        m_state = State::Open;
    onEnd(failure);
}

void Channel::close() {
    m_state = State::Closed;
    m_timer.stop();
    m_onEnd = nullptr;
    m_hold.release();
}

void Channel::linkLost() {
    if (opening())
        end("Connection reset by peer (104)");
    else
        close();
}

} // namespace Bluetooth::Sim
