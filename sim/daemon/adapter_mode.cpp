// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/adapter_mode.h"

#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "serving/bluez4/errors.h"

#include <algorithm>
#include <utility>

namespace Bluetooth::Sim {

namespace {

constexpr guint32 limitedDiscoverable = 0x2000;
constexpr guint32 mostSecondsOfLimited = 60;

constexpr BluezError alreadyChanging = Errors::failed("Operation already in progress");

} // namespace

AdapterMode::AdapterMode(ServedAdapter& adapter) : m_adapter(adapter) {}

bool AdapterMode::pairable() const {
    return m_adapter.hardware().pairable;
}

guint32 AdapterMode::deviceClass() const {
    const AdapterHardware& hardware = m_adapter.hardware();
    return hardware.deviceClass | m_adapter.daemon().records().classBits(hardware.id()) |
           (m_limited ? limitedDiscoverable : 0);
}

/// The mode that the next power-on brings back. A time-out of Discoverable does not change it.
AdapterMode::Mode AdapterMode::storedMode() const {
    return m_adapter.hardware().discoverable ? Mode::Discoverable : Mode::Connectable;
}

void AdapterMode::comeUp() {
    if (!m_adapter.hardware().powered)
        return;
    m_mode = m_lastingMode = storedMode();
    m_limited = limited();
    m_adapter.changed("Powered", true);
    m_adapter.changed("Pairable", pairable());
    m_adapter.changed("Class", deviceClass());
    m_adapter.changed("Name", m_adapter.hardware().name);
    m_adapter.changed("Pairable", pairable());
    m_adapter.changed("Discoverable", discoverable());
    startDiscoverableTimeout();
    startPairableTimeout();
}

void AdapterMode::goDown() {
    m_change.stop();
    if (powered())
        powerOff();
    if (const CallPtr call = std::exchange(m_changing, nullptr))
        call->fail(Errors::failed("Invalid argument"));
    m_sessions.clear();
}

void AdapterMode::powerOn() {
    m_adapter.hardware().powered = true;
    m_limited = limited();
    m_adapter.changed("Powered", true);
    m_adapter.changed("Pairable", pairable());
    m_adapter.changed("Class", deviceClass());
    m_adapter.changed("Pairable", pairable());
    m_adapter.changed("Discoverable", discoverable());
    startPairableTimeout();
}

void AdapterMode::powerOff() {
    const bool wasDiscoverable = discoverable();
    m_mode = Mode::Off;
    m_adapter.loseDevices();
    m_discoverableTimer.stop();
    if (wasDiscoverable)
        m_adapter.changed("Discoverable", false);
    // Only the signal says so: GetProperties keeps the value that the next power-on brings back.
    if (pairable())
        m_adapter.changed("Pairable", false);
    m_adapter.discovery().stop();
    m_adapter.changed("Powered", false);
}

void AdapterMode::setPowered(const CallPtr& call, const Value& value) {
    change(call, value.flag() ? storedMode() : Mode::Off);
}

void AdapterMode::setDiscoverable(const CallPtr& call, const Value& value) {
    // Either value turns an adapter on that is off.
    change(call, value.flag() ? Mode::Discoverable : Mode::Connectable);
}

/// Changes the mode, which takes time unless it is turned off, and answers.
void AdapterMode::change(const CallPtr& call, Mode wanted) {
    if (wanted == m_mode) {
        m_lastingMode = wanted;
        return call->reply();
    }
    if (m_change.running())
        return call->fail(alreadyChanging);
    const bool isSetting = call->member() == "SetProperty";
    const auto finish = [this, call, wanted, isSetting] {
        m_changing.reset();
        changeTo(wanted);
        if (isSetting)
            m_lastingMode = wanted;
        call->reply();
        classMayChange();
    };
    const Times& times = m_adapter.daemon().times();
    if (wanted == Mode::Off)
        return finish();
    m_changing = call;
    m_change.start(times.scaled(times.modeChange), finish);
}

void AdapterMode::changeTo(Mode wanted) {
    const bool wasPowered = powered();
    if (wanted == Mode::Off) {
        powerOff();
        m_adapter.hardware().powered = false;
        m_sessions.clear();
        return;
    }
    m_mode = wanted;
    m_adapter.hardware().discoverable = discoverable();
    if (wasPowered)
        m_adapter.changed("Discoverable", discoverable());
    else
        powerOn();
    startDiscoverableTimeout();
}

void AdapterMode::setPairable(const CallPtr& call, const Value& value) {
    if (!powered())
        return call->fail(Errors::notReady);
    if (value.flag() == pairable())
        return call->reply();
    if (discoverable() && m_change.running())
        return call->fail(alreadyChanging);
    m_adapter.hardware().pairable = value.flag();
    m_adapter.changed("Pairable", value);
    startPairableTimeout();
    call->reply();
}

void AdapterMode::setDiscoverableTimeout(const CallPtr& call, const Value& value) {
    guint32& timeout = m_adapter.hardware().discoverableTimeout;
    if (value.number() == 0 && timeout == 0)
        return call->reply();
    timeout = value.number();
    m_adapter.changed("DiscoverableTimeout", value);
    startDiscoverableTimeout();
    call->reply();
    classMayChange();
}

void AdapterMode::setPairableTimeout(const CallPtr& call, const Value& value) {
    guint32& timeout = m_adapter.hardware().pairableTimeout;
    if (value.number() == 0 && timeout == 0)
        return call->reply();
    timeout = value.number();
    m_adapter.changed("PairableTimeout", value);
    startPairableTimeout();
    call->reply();
}

void AdapterMode::startDiscoverableTimeout() {
    m_discoverableTimer.stop();
    const guint32 seconds = m_adapter.hardware().discoverableTimeout;
    if (discoverable() && seconds != 0)
        m_discoverableTimer.start(m_adapter.daemon().times().scaledSeconds(seconds), [this] {
            m_mode = Mode::Connectable;
            m_adapter.changed("Discoverable", false);
            classMayChange();
        });
}

void AdapterMode::startPairableTimeout() {
    m_pairableTimer.stop();
    const guint32 seconds = m_adapter.hardware().pairableTimeout;
    if (!pairable() || seconds == 0)
        return;
    m_pairableTimer.start(m_adapter.daemon().times().scaledSeconds(seconds), [this] {
        if (!powered())
            return;
        m_adapter.hardware().pairable = false;
        m_adapter.changed("Pairable", false);
    });
}

bool AdapterMode::limited() const {
    const guint32 seconds = m_adapter.hardware().discoverableTimeout;
    return discoverable() && pairable() && seconds != 0 && seconds <= mostSecondsOfLimited;
}

/// Pairable alone never gets here: the class follows it with the next change of the others.
void AdapterMode::classMayChange() {
    if (!powered() || limited() == m_limited)
        return;
    m_limited = limited();
    m_adapter.changed("Class", deviceClass());
}

void AdapterMode::requestSession(const CallPtr& call) {
    ClientAgent* agent = m_adapter.agent();
    if (!agent)
        return call->fail(Errors::agentNotAvailable);
    if (m_sessions.empty())
        m_lastingMode = m_mode;
    const bool hasOne =
        std::find(m_sessions.begin(), m_sessions.end(), call->sender()) != m_sessions.end();
    const Mode wanted = storedMode();
    if (hasOne || m_mode >= wanted) {
        m_sessions.push_back(call->sender());
        return call->reply();
    }
    if (agent->busy())
        return call->fail(Errors::failed("Device or resource busy"));
    m_asking = call;
    const char* mode = wanted == Mode::Discoverable ? "discoverable" : "connectable";
    agent->ask("ConfirmModeChange", tuple(mode), "", m_adapter.daemon().times().agentTimeout,
               [this, call, wanted](const CallResult& answer) {
                   m_asking.reset();
                   if (answer.failed)
                       return call->fail(answer.error);
                   m_sessions.push_back(call->sender());
                   change(call, wanted);
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
    if (m_asking && m_asking->sender() == client && m_adapter.agent()) {
        m_adapter.agent()->cancel();
        m_asking.reset();
    }
    const auto end = std::remove(m_sessions.begin(), m_sessions.end(), client);
    if (end == m_sessions.end())
        return;
    m_sessions.erase(end, m_sessions.end());
    sessionEnded();
}

/// With the last session goes what it has brought.
void AdapterMode::sessionEnded() {
    if (!m_sessions.empty() || m_mode == m_lastingMode || m_change.running())
        return;
    changeTo(m_lastingMode);
    classMayChange();
}

} // namespace Bluetooth::Sim
