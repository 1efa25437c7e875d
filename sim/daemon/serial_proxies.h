// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERIAL_PROXIES_H
#define KESBLUETOOTH_SIM_DAEMON_SERIAL_PROXIES_H

#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

class Bluetoothd;
class SerialProxy;
class ServedAdapter;
class ServedDevice;

/// org.bluez.SerialProxyManager of an adapter.
class SerialProxies {
public:
    explicit SerialProxies(ServedAdapter& adapter);
    SerialProxies(const SerialProxies&) = delete;
    SerialProxies& operator=(const SerialProxies&) = delete;
    ~SerialProxies();

    Bluetoothd& daemon() const;
    std::string adapterId() const;
    /// The lowest RFCOMM channel that no proxy uses, or 0.
    int freeChannel() const;
    /// A device connects to a service of ours: the agent is asked unless the device is trusted.
    /// @return false when no proxy that is enabled has it
    bool peerConnects(ServedDevice& device, const std::string& uuid);
    void clientGone(const std::string& client);
    /// Takes all of them off the bus without a word.
    void retire();

private:
    using Proxies = std::vector<std::unique_ptr<SerialProxy>>;

    template <class Served>
    friend const Interface& Serving::serialProxyManagerInterface();

    void createProxy(const CallPtr& call);
    void listProxies(const CallPtr& call);
    void removeProxy(const CallPtr& call);

    Proxies::const_iterator find(const std::string& path) const;
    void remove(Proxies::const_iterator proxy);
    void emit(const char* member, const std::string& path);

    ServedAdapter& m_adapter;
    Proxies m_proxies;
};

} // namespace Bluetooth::Sim

#endif
