// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/client_records.h"

#include "daemon/authorization.h"
#include "daemon/bluetoothd.h"
#include "daemon/client_agent.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "daemon/xml_record.h"
#include "serving/bluez4/address.h"
#include "serving/bluez4/errors.h"

#include <utility>

namespace Bluetooth::Sim {

ClientRecords::ClientRecords(Bluetoothd& daemon, ServedAdapter* adapter)
    : m_daemon(daemon), m_adapter(adapter) {
    m_daemon.objects().add(adapter ? adapter->path() : daemon.basePath() + "/any",
                           serviceInterface<ClientRecords>(), this);
}

std::string ClientRecords::adapterId() const {
    return m_adapter ? m_adapter->hardware().id() : "";
}

bool ClientRecords::owns(const CallPtr& call, guint32 handle) const {
    const OwnRecords::Record* record = m_daemon.records().find(handle);
    return m_handles.count(handle) && record && record->owner == call->sender();
}

void ClientRecords::addRecord(const CallPtr& call) {
    const auto uuid = serviceClassOfXml(call->text(0));
    if (!uuid)
        return call->fail(Errors::failed("Input/output error"));
    m_daemon.changeRecords([&] {
        const guint32 handle = m_daemon.records().add({adapterId(), *uuid, call->sender()});
        m_handles.insert(handle);
        call->reply(tuple(handle));
    });
}

void ClientRecords::updateRecord(const CallPtr& call) {
    const guint32 handle = call->number(0);
    const std::string xml = call->text(1);
    if (xml.empty())
        return call->fail(Errors::invalidArguments);
    if (!owns(call, handle))
        return call->fail(Errors::notAvailable);
    const auto uuid = serviceClassOfXml(xml);
    if (!uuid)
        return call->fail(Errors::failed("Parsing of XML service record failed"));
    m_daemon.changeRecords([&] {
        m_daemon.records().remove(handle);
        m_daemon.records().add({adapterId(), *uuid, call->sender()}, handle);
        call->reply();
    });
}

void ClientRecords::removeRecord(const CallPtr& call) {
    const guint32 handle = call->number(0);
    if (!owns(call, handle))
        return call->fail(Errors::notAvailable);
    m_daemon.changeRecords([&] {
        m_handles.erase(handle);
        m_daemon.records().remove(handle);
        call->reply();
    });
}

void ClientRecords::clientGone(const std::string& client) {
    if (m_waiting && m_waiting->sender() == client)
        m_waiting.reset();
    m_daemon.changeRecords([&] {
        for (const guint32 handle : std::exchange(m_handles, {})) {
            const OwnRecords::Record* record = m_daemon.records().find(handle);
            if (record && record->owner == client)
                m_daemon.records().remove(handle);
            else
                m_handles.insert(handle);
        }
    });
}

void ClientRecords::requestAuthorization(const CallPtr& call) {
    if (m_waiting && m_waiting->sender() == call->sender())
        return call->fail(Errors::doesNotExist);
    const guint32 handle = call->number(1);
    const bool known = owns(call, handle) || m_daemon.anyRecords().owns(call, handle);
    const OwnRecords::Record* record = m_daemon.records().find(handle);
    if (m_waiting || !known || record->uuid.empty())
        return call->fail(Errors::notAuthorized);
    m_waiting = call;
    if (!ask(upperCase(call->text(0)), record->uuid))
        answered(false);
}

/// @return false when nobody can be asked
bool ClientRecords::ask(const std::string& address, const std::string& uuid) {
    for (const auto& adapter : m_daemon.adapters()) {
        if (m_adapter && adapter.get() != m_adapter)
            continue;
        const auto device = adapter->find(address);
        if (device && device->link().up() &&
            authorize(*device, uuid, [this](bool allowed) { answered(allowed); }))
            return true;
    }
    return false;
}

void ClientRecords::answered(bool allowed) {
    const CallPtr call = std::exchange(m_waiting, nullptr);
    if (!call)
        return;
    if (allowed)
        call->reply();
    else
        call->fail(Errors::notAuthorized);
}

void ClientRecords::cancelAuthorization(const CallPtr& call) {
    if (!m_waiting || m_waiting->sender() != call->sender())
        return call->fail(Errors::doesNotExist);
    // The daemon finds no agent for a request of all adapters: that one goes on.
    if (m_adapter && m_adapter->agent())
        m_adapter->agent()->cancel();
    answered(false);
    call->reply();
}

} // namespace Bluetooth::Sim
