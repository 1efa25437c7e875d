// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_services.h"

#include "daemon/adapter_services.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "world/settings.h"

namespace Bluetooth::Sim {

void DeviceServices::serve() {
    m_input.serve();
    m_network.serve();
    m_serial.serve();
}

bool DeviceServices::peerConnects(const std::string& uuid) {
    if (uuid != fullUuid("1124"))
        return m_device.adapter().services().proxies().peerConnects(m_device, uuid);
    m_input.peerConnects();
    return true;
}

bool DeviceServices::peerDisconnects(const std::string& uuid) {
    if (uuid == fullUuid("1124"))
        m_input.disconnected();
    else if (DeviceNetwork::isRole(uuid))
        m_network.disconnected();
    else
        return m_serial.hangUp(uuid);
    return true;
}

void DeviceServices::disconnectRequested() {
    m_input.disconnected();
    m_network.disconnected();
}

void DeviceServices::linkLost() {
    m_input.disconnected();
    m_network.disconnected();
    m_serial.linkLost();
}

void DeviceServices::clientGone(const std::string& client) {
    m_network.clientGone(client);
    m_serial.clientGone(client);
}

void DeviceServices::abandon() {
    m_input.abandon();
    m_network.abandon();
    m_serial.abandon();
}

} // namespace Bluetooth::Sim
