// SPDX-License-Identifier: LGPL-2.1-or-later
#include "target.h"

#include "wakeup.h"

#include <bluetooth/bluez_object.h>
#include <bluetooth/commandlib.h>
#include <bluetooth/dict_codec.h>

#include <syslog.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <utility>

namespace AutoConnectd {

namespace {

std::string addressOf(const std::string& path) {
    const std::unique_ptr<char, decltype(&free)> address(
        Bluetooth::getAddressFromPath(path.c_str()), &free);
    return address ? address.get() : path;
}

void onChanged(Bluetooth::RemoteObject* /*sender*/, const char* name,
               const Bluetooth::Variant* /*value*/) {
    if (strcmp(name, "Connected") == 0 || strcmp(name, "State") == 0)
        tellConnection();
}

} // namespace

Target::Target(const std::string& device, const Service& service, Pace pace)
    : m_service(service),
      m_path(device),
      m_name(std::string(service.name) + " of " + addressOf(device)),
      m_pace(pace),
      m_proxy(service.makeProxy(device.c_str())),
      m_failures(m_name),
      m_delay(pace.first) {}

Target::~Target() = default;

bool Target::isOf(const std::string& device, const Service& service) const {
    return m_path == device && &m_service == &service;
}

Target::Opening Target::open() {
    bool connected = false;
    if (m_proxy->setPropertyChangedHandler(onChanged) == 0 && queryConnected(connected))
        return Opening::Done;
    return strcmp(m_proxy->getErrorName(), DBUS_ERROR_UNKNOWN_METHOD) == 0 ? Opening::NotServed
                                                                           : Opening::NotAnswered;
}

void Target::wasTried(Clock::time_point when) {
    m_tried = when;
    m_due = when + m_pace.first;
}

bool Target::queryConnected(bool& connected) {
    const std::unique_ptr<Bluetooth::Dict> properties(m_proxy->getProperties());
    connected = Bluetooth::find(properties.get(), m_service.property) == m_service.connected;
    return properties != nullptr;
}

bool Target::check(Clock::time_point now, bool mayConnect) {
    // Before the state is asked for: who has connected is not called unsuccessful after that.
    const auto result = m_attempt.takeResult(now);
    bool connected = false;
    if (!queryConnected(connected)) {
        if (m_connected)
            syslog(LOG_NOTICE, "%s is gone", m_name.c_str());
        return false;
    }
    if (result && !result->empty() && !connected)
        m_failures.add(*result);
    if (connected != m_connected)
        noteConnection(connected, now);
    if (!m_connected && mayConnect && now >= m_due && !m_attempt.isRunning())
        connect(now);
    return true;
}

void Target::noteConnection(bool connected, Clock::time_point now) {
    m_connected = connected;
    m_announced = false;
    m_delay = m_pace.first;
    m_due = now + m_delay;
    const std::string failed = connected ? m_failures.end() : "";
    syslog(LOG_NOTICE, "%s %s%s%s", m_name.c_str(), connected ? "connected" : "disconnected",
           failed.empty() ? "" : " after ", failed.c_str());
}

void Target::connect(Clock::time_point now) {
    if (!m_announced)
        syslog(LOG_INFO, "connecting %s", m_name.c_str());
    m_announced = true;
    m_tried = now;
    m_attempt.begin(*m_proxy, now);
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
