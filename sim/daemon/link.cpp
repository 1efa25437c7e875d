// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/link.h"

#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/device_services.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"

namespace Bluetooth::Sim {

void Link::connect(const Hold& hold, OnPaged onPaged) {
    if (m_up)
        return onPaged(true);
    m_waiting.push_back({&hold, std::move(onPaged)});
    if (!m_pager.running())
        page();
}

void Link::page() {
    const Times& times = m_device.adapter().daemon().times();
    if (!m_device.reachable())
        return m_pager.start(times.scaled(times.pageTimeout), [this] { paged(false); });
    m_pager.start(times.scaled(times.connect), [this] {
        if (m_device.reachable())
            return paged(true);
        page();
    });
}

void Link::paged(bool reached) {
    if (reached)
        comeUp();
    // What one of them does may let another wait no longer, or anew.
    m_answered.splice(m_answered.end(), m_waiting);
    while (!m_answered.empty()) {
        const OnPaged onPaged = std::move(m_answered.front().onPaged);
        m_answered.pop_front();
        onPaged(reached);
    }
}

void Link::accept(bool stays) {
    m_pager.stop();
    m_heldByPeer = stays;
    paged(true);
}

void Link::comeUp() {
    if (m_up)
        return;
    m_up = true;
    m_device.changed("Connected", true);
    m_device.learnName();
}

Link::Hold Link::hold() {
    m_idle.stop();
    return Hold(*this);
}

void Link::released(const Hold& hold, guint Times::*idle) {
    for (std::list<Waiting>* all : {&m_waiting, &m_answered})
        all->remove_if([&](const Waiting& one) { return one.hold == &hold; });
    if (m_waiting.empty())
        m_pager.stop(); // nobody wants it any more
    if (--m_holds != 0 || m_heldByPeer || !m_up)
        return;
    const Times& times = m_device.adapter().daemon().times();
    m_idle.start(times.scaled(times.*idle), [this] { drop(); });
}

void Link::drop() {
    if (!m_up)
        return;
    m_idle.stop();
    m_disconnect.stop();
    m_up = false;
    m_heldByPeer = false;
    const auto calls = std::move(m_disconnects);
    m_disconnects.clear();
    for (const CallPtr& call : calls)
        call->reply();
    m_device.changed("Connected", false);
    m_device.linkLost();
}

void Link::powerLost() {
    if (m_up)
        return drop();
    m_pager.stop();
    paged(false);
}

void Link::requestDisconnect(const CallPtr& call) {
    m_device.cancelSearch();
    if (call)
        m_disconnects.push_back(call);
    if (m_disconnect.running())
        return;
    const Times& times = m_device.adapter().daemon().times();
    m_device.audio().disconnectRequested(); // what uses the link lets go of it first
    m_device.emit("DisconnectRequested", {});
    m_device.services().disconnectRequested();
    m_disconnect.start(times.scaled(times.disconnectRequest), [this] { drop(); });
}

void Link::abandon() {
    m_up = false;
    m_waiting.clear();
    m_answered.clear();
    m_disconnects.clear();
    m_pager.stop();
    m_idle.stop();
    m_disconnect.stop();
}

} // namespace Bluetooth::Sim
