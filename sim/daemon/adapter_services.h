// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_ADAPTER_SERVICES_H
#define KESBLUETOOTH_SIM_DAEMON_ADAPTER_SERVICES_H

#include "daemon/client_records.h"
#include "daemon/network_server.h"
#include "daemon/serial_proxies.h"

#include <string>

namespace Bluetooth::Sim {

class ServedAdapter;

/// What clients offer to devices by an adapter: Service, NetworkServer and SerialProxyManager.
class AdapterServices {
public:
    explicit AdapterServices(ServedAdapter& adapter);

    SerialProxies& proxies() { return m_proxies; }
    void clientGone(const std::string& client);
    /// The adapter goes.
    void retire() { m_proxies.retire(); }

private:
    ClientRecords m_records;
    NetworkServer m_networkServer;
    SerialProxies m_proxies;
};

} // namespace Bluetooth::Sim

#endif
