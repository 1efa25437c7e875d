// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_NETWORK_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_NETWORK_H

#include "daemon/channel.h"
#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// org.bluez.Network of a device that gives access to a network.
///
/// bluetoothd 4.101 registers its Connect without an argument and never answers it. The device's
/// scenario can ask for the Connect of the document instead, which names an interface, though
/// there is none of that name on the machine.
class DeviceNetwork {
public:
    explicit DeviceNetwork(ServedDevice& device) : m_device(device), m_channel(device) {}

    /// Whether a full UUID is that of one of the three network services.
    static bool isRole(const std::string& uuid);

    /// Serves the interface if the device's UUIDs call for it and it is not served yet.
    void serve();
    /// It is connected no longer, because of the device or of its link.
    void disconnected();
    void clientGone(const std::string& client);
    void abandon();

private:
    template <class Served>
    friend const Interface& Serving::networkInterface();
    template <class Served>
    friend const Interface& Serving::documentedNetworkInterface();

    void connectNothing(const CallPtr&) {}
    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);
    void getProperties(const CallPtr& call);

    void connected(const CallPtr& call, const std::string& uuid);
    void release();
    void changed(const char* property, const Value& value);
    std::string interface() const;

    ServedDevice& m_device;
    bool m_served = false;
    std::string m_owner;   ///< of the connection, also while it is made
    std::string m_uuid;    ///< while connected
    unsigned m_number = 0; ///< of the interface
    Channel m_channel;
};

} // namespace Bluetooth::Sim

#endif
