// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/adapter_mode.h"

#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "serving/bluez4/errors.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr guint32 limitedDiscoverable = 0x2000;

} // namespace

AdapterMode::AdapterMode(ServedAdapter& adapter) : m_adapter(adapter) {}

bool AdapterMode::pairable() const {
    return m_adapter.hardware().pairable;
}

bool AdapterMode::limited() const {
    return m_discoverable && m_adapter.hardware().discoverableTimeout != 0;
}

guint32 AdapterMode::deviceClass() const {
    return m_adapter.hardware().deviceClass | (limited() ? limitedDiscoverable : 0);
}

void AdapterMode::comeUp() {
    if (!m_adapter.hardware().powered)
        return;
    m_powered = true;
    m_adapter.changed("Powered", true);
    m_adapter.changed("Pairable", pairable());
    m_adapter.changed("Class", deviceClass());
    m_adapter.changed("Name", m_adapter.hardware().name);
    m_adapter.changed("Pairable", pairable());
    m_discoverable = m_adapter.hardware().discoverable;
    m_adapter.changed("Discoverable", m_discoverable);
    startDiscoverableTimeout();
}

void AdapterMode::goDown() {
    if (m_powered)
        powerOff();
    m_sessions.clear();
}

void AdapterMode::powerOn() {
    m_powered = true;
    m_adapter.hardware().powered = true;
    m_adapter.changed("Powered", true);
    m_adapter.changed("Pairable", pairable());
}

void AdapterMode::powerOff() {
    m_powered = false;
    m_adapter.loseDevices();
    m_restoreDiscoverable = m_discoverable;
    m_discoverableTimer.stop();
    m_pairableTimer.stop();
    if (m_discoverable) {
        m_discoverable = false;
        m_adapter.changed("Discoverable", false);
    }
    // Only the signal says so: GetProperties keeps the value that the next power-on brings back.
    m_adapter.changed("Pairable", false);
    m_adapter.discovery().stop();
    m_adapter.changed("Powered", false);
    m_powerFromSession = false;
}

void AdapterMode::setPowered(const CallPtr& call, const Value& value) {
    if (value.flag() == m_powered)
        return call->reply();
    if (m_powered) {
        powerOff();
        m_adapter.hardware().powered = false;
        m_sessions.clear();
    } else {
        powerOn();
        m_adapter.changed("Class", deviceClass());
        m_adapter.changed("Pairable", pairable());
        m_discoverable = m_restoreDiscoverable;
        m_adapter.changed("Discoverable", m_discoverable);
        startDiscoverableTimeout();
    }
    call->reply();
}

void AdapterMode::setDiscoverable(const CallPtr& call, const Value& value) {
    const bool wanted = value.flag();
    if (wanted == m_discoverable)
        return call->reply();
    if (wanted && !m_powered)
        powerOn();
    const bool wasLimited = limited();
    m_discoverable = wanted;
    m_adapter.hardware().discoverable = wanted;
    m_adapter.changed("Discoverable", wanted);
    startDiscoverableTimeout();
    call->reply();
    classChangedFrom(wasLimited);
}

void AdapterMode::setPairable(const CallPtr& call, const Value& value) {
    if (value.flag() == pairable())
        return call->reply();
    m_adapter.hardware().pairable = value.flag();
    m_adapter.changed("Pairable", value);
    startPairableTimeout();
    call->reply();
}

void AdapterMode::setDiscoverableTimeout(const CallPtr& call, const Value& value) {
    if (value.number() == m_adapter.hardware().discoverableTimeout)
        return call->reply();
    const bool wasLimited = limited();
    m_adapter.hardware().discoverableTimeout = value.number();
    m_adapter.changed("DiscoverableTimeout", value);
    startDiscoverableTimeout();
    call->reply();
    classChangedFrom(wasLimited);
}

void AdapterMode::setPairableTimeout(const CallPtr& call, const Value& value) {
    if (value.number() == m_adapter.hardware().pairableTimeout)
        return call->reply();
    m_adapter.hardware().pairableTimeout = value.number();
    m_adapter.changed("PairableTimeout", value);
    startPairableTimeout();
    call->reply();
}

void AdapterMode::startDiscoverableTimeout() {
    m_discoverableTimer.stop();
    const guint32 seconds = m_adapter.hardware().discoverableTimeout;
    if (!m_discoverable || seconds == 0)
        return;
    m_discoverableTimer.start(m_adapter.daemon().times().scaledSeconds(seconds), [this] {
        const bool wasLimited = limited();
        m_discoverable = false;
        m_adapter.hardware().discoverable = false;
        m_adapter.changed("Discoverable", false);
        classChangedFrom(wasLimited);
    });
}

void AdapterMode::startPairableTimeout() {
    m_pairableTimer.stop();
    const guint32 seconds = m_adapter.hardware().pairableTimeout;
    if (!m_powered || !pairable() || seconds == 0)
        return;
    m_pairableTimer.start(m_adapter.daemon().times().scaledSeconds(seconds), [this] {
        m_adapter.hardware().pairable = false;
        m_adapter.changed("Pairable", false);
    });
}

void AdapterMode::classChangedFrom(bool wasLimited) {
    if (limited() != wasLimited)
        m_adapter.changed("Class", deviceClass());
}

void AdapterMode::requestSession(const CallPtr& call) {
    ClientAgent* agent = m_adapter.agent();
    if (!agent)
        return call->fail(Errors::agentNotAvailable);
    if (m_powered) {
        m_sessions.push_back(call->sender());
        return call->reply();
    }
    if (agent->busy())
        return call->fail(Errors::failed("Device or resource busy"));
    const char* mode = m_restoreDiscoverable ? "discoverable" : "connectable";
    agent->ask("ConfirmModeChange", tuple(mode), "", m_adapter.daemon().times().agentTimeout,
               [this, call](const CallResult& answer) {
                   if (answer.failed)
                       return call->fail(answer.error);
                   m_sessions.push_back(call->sender());
                   m_powerFromSession = true;
                   setPowered(call, true);
               });
}

void AdapterMode::releaseSession(const CallPtr& call) {
    const auto session = std::find(m_sessions.begin(), m_sessions.end(), call->sender());
    if (session == m_sessions.end())
        return call->fail(Errors::failed("Invalid Session"));
    m_sessions.erase(session);
    call->reply();
    sessionEnded();
}

void AdapterMode::clientGone(const std::string& client) {
    const auto end = std::remove(m_sessions.begin(), m_sessions.end(), client);
    if (end == m_sessions.end())
        return;
    m_sessions.erase(end, m_sessions.end());
    sessionEnded();
}

void AdapterMode::sessionEnded() {
    if (!m_sessions.empty() || !m_powerFromSession || !m_powered)
        return;
    powerOff();
    m_adapter.hardware().powered = false;
}

} // namespace Bluetooth::Sim
