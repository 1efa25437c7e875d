// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_SERVICES_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_SERVICES_H

#include "daemon/device_input.h"
#include "daemon/device_network.h"
#include "daemon/device_serial.h"

#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// What a device has of Input, Network and Serial.
class DeviceServices {
public:
    explicit DeviceServices(ServedDevice& device)
        : m_device(device), m_input(device), m_network(device), m_serial(device) {}

    DeviceSerial& serial() { return m_serial; }

    /// Serves the interfaces that the device's UUIDs call for and that are not served yet.
    void serve();
    /// The device opens a service of ours. @return false when it is none of these
    bool peerConnects(const std::string& uuid);
    /// The device closes one of its services. @return false when it is none of these
    bool peerDisconnects(const std::string& uuid);
    /// The link is about to end; what watches that lets go of it.
    void disconnectRequested();
    void linkLost();
    void clientGone(const std::string& client);
    void abandon();

private:
    ServedDevice& m_device;
    DeviceInput m_input;
    DeviceNetwork m_network;
    DeviceSerial m_serial;
};

} // namespace Bluetooth::Sim

#endif
