// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/network_server.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "serving/bluez4/errors.h"
#include "world/settings.h"

#include <utility>

namespace Bluetooth::Sim {

namespace {

constexpr BluezError invalidUuid = Errors::failed("Invalid UUID");

/// The only service that 4.101 registers; it knows no other form of its UUID.
constexpr const char* accessPoint = "nap";

} // namespace

NetworkServer::NetworkServer(ServedAdapter& adapter) : m_adapter(adapter) {
    m_adapter.daemon().objects().add(m_adapter.path(), networkServerInterface<NetworkServer>(),
                                     this);
}

void NetworkServer::registerServer(const CallPtr& call) {
    if (call->text(0) != accessPoint)
        return call->fail(invalidUuid);
    if (m_handle)
        return call->fail(Errors::alreadyExists);
    m_adapter.daemon().changeRecords([&] {
        m_owner = call->sender();
        m_handle = m_adapter.daemon().records().add(
            {m_adapter.hardware().id(), fullUuid("1116"), m_owner});
        call->reply();
    });
}

/// Any client may, and also when none is registered.
void NetworkServer::unregisterServer(const CallPtr& call) {
    if (call->text(0) != accessPoint)
        return call->fail(invalidUuid);
    m_adapter.daemon().changeRecords([&] {
        removeRecord();
        call->reply();
    });
}

void NetworkServer::clientGone(const std::string& client) {
    if (m_owner == client)
        m_adapter.daemon().changeRecords([this] { removeRecord(); });
}

void NetworkServer::removeRecord() {
    m_owner.clear();
    if (m_handle)
        m_adapter.daemon().records().remove(*std::exchange(m_handle, std::nullopt));
}

} // namespace Bluetooth::Sim
