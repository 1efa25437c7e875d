// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_INPUT_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_INPUT_H

#include "daemon/channel.h"
#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

namespace Bluetooth::Sim {

class ServedDevice;

/// org.bluez.Input of a keyboard, a mouse or a headset with buttons.
class DeviceInput {
public:
    explicit DeviceInput(ServedDevice& device) : m_device(device), m_channel(device) {}

    /// Serves the interface if the device's UUIDs call for it and it is not served yet.
    void serve();
    /// The device connects: the agent is asked unless the device is trusted.
    void peerConnects();
    /// It is connected no longer, because of the device or of its link.
    void disconnected();
    void abandon();

private:
    template <class Served>
    friend const Interface& Serving::inputInterface();

    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);
    void getProperties(const CallPtr& call);

    void setConnected(bool connected);

    ServedDevice& m_device;
    bool m_served = false;
    bool m_connected = false;
    CallPtr m_call; ///< Connect that waits
    Channel m_channel;
};

} // namespace Bluetooth::Sim

#endif
