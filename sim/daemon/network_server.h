// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_NETWORK_SERVER_H
#define KESBLUETOOTH_SIM_DAEMON_NETWORK_SERVER_H

#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

#include <optional>
#include <string>

namespace Bluetooth::Sim {

class ServedAdapter;

/// org.bluez.NetworkServer of an adapter: the record of a network access point, without a network.
class NetworkServer {
public:
    explicit NetworkServer(ServedAdapter& adapter);
    NetworkServer(const NetworkServer&) = delete;
    NetworkServer& operator=(const NetworkServer&) = delete;

    void clientGone(const std::string& client);

private:
    template <class Served>
    friend const Interface& Serving::networkServerInterface();

    void registerServer(const CallPtr& call);
    void unregisterServer(const CallPtr& call);

    void removeRecord();

    ServedAdapter& m_adapter;
    std::optional<guint32> m_handle;
    std::string m_owner;
};

} // namespace Bluetooth::Sim

#endif
