// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/adapter_services.h"

#include "daemon/served_adapter.h"

namespace Bluetooth::Sim {

AdapterServices::AdapterServices(ServedAdapter& adapter)
    : m_records(adapter.daemon(), &adapter), m_networkServer(adapter), m_proxies(adapter) {}

void AdapterServices::clientGone(const std::string& client) {
    m_records.clientGone(client);
    m_networkServer.clientGone(client);
    m_proxies.clientGone(client);
}

} // namespace Bluetooth::Sim
