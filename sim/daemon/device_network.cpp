// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_network.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>

namespace Bluetooth::Sim {

namespace {

struct Role {
    const char* name;
    const char* uuid;
};

constexpr Role roles[] = {{"panu", "1115"}, {"nap", "1116"}, {"gn", "1117"}};

/// The service that is meant: a name, a full UUID, or whatever begins as a hexadecimal number.
std::string roleOf(const std::string& text) {
    const auto number = static_cast<guint16>(std::strtol(text.c_str(), nullptr, 16));
    for (const Role& role : roles) {
        const std::string uuid = fullUuid(role.uuid);
        const bool named = g_ascii_strcasecmp(text.c_str(), role.name) == 0 ||
                           g_ascii_strcasecmp(text.c_str(), uuid.c_str()) == 0;
        if (named || number == std::strtol(role.uuid, nullptr, 16))
            return uuid;
    }
    return "";
}

} // namespace

bool DeviceNetwork::isRole(const std::string& uuid) {
    return std::any_of(std::begin(roles), std::end(roles),
                       [&](const Role& role) { return fullUuid(role.uuid) == uuid; });
}

void DeviceNetwork::serve() {
    const auto& uuids = m_device.stored().uuids;
    const bool wanted = std::any_of(uuids.begin(), uuids.end(), isRole);
    if (m_served || !wanted)
        return;
    m_served = true;
    const auto peer = m_device.peer();
    m_device.adapter().daemon().objects().add(m_device.path(),
                                              peer && peer->documentedNetwork
                                                  ? documentedNetworkInterface<DeviceNetwork>()
                                                  : networkInterface<DeviceNetwork>(),
                                              this);
}

std::string DeviceNetwork::interface() const {
    return m_uuid.empty() ? "" : "bnep" + std::to_string(m_number);
}

void DeviceNetwork::changed(const char* property, const Value& value) {
    m_device.adapter().daemon().bus().emit(m_device.path(), Interfaces::network, "PropertyChanged",
                                           propertyChange(property, value));
}

void DeviceNetwork::connect(const CallPtr& call) {
    const std::string uuid = roleOf(call->text(0));
    if (uuid.empty() || !m_device.offers(uuid))
        return call->fail(Errors::notSupported);
    if (!m_owner.empty())
        return call->fail(Errors::alreadyConnected);
    m_owner = call->sender();
    m_channel.open(serviceOf(uuid), [this, call, uuid](const char* failure) {
        if (!failure)
            return connected(call, uuid);
        m_owner.clear();
        call->fail(Errors::failed(failure));
    });
}

void DeviceNetwork::connected(const CallPtr& call, const std::string& uuid) {
    auto& numbers = m_device.adapter().daemon().numbers().networkInterfaces;
    for (m_number = 0; !numbers.insert(m_number).second;)
        ++m_number;
    m_uuid = uuid;
    call->reply(tuple(interface()));
    changed("Connected", true);
    changed("Interface", interface());
    changed("UUID", uuid);
}

void DeviceNetwork::disconnect(const CallPtr& call) {
    if (m_owner.empty())
        return call->fail(Errors::notConnected);
    if (m_owner != call->sender())
        return call->fail(Errors::notAuthorized);
    call->reply();
    release();
}

/// Ends the connection, or an attempt, whose Connect is not answered then.
void DeviceNetwork::release() {
    m_channel.close();
    disconnected();
}

void DeviceNetwork::disconnected() {
    m_channel.linkLost();
    m_owner.clear();
    if (m_uuid.empty())
        return;
    m_device.adapter().daemon().numbers().networkInterfaces.erase(m_number);
    m_uuid.clear();
    changed("Connected", false);
    changed("Interface", "");
    changed("UUID", "");
}

void DeviceNetwork::clientGone(const std::string& client) {
    if (m_owner == client)
        release();
}

void DeviceNetwork::abandon() {
    m_channel.close();
    if (!m_uuid.empty())
        m_device.adapter().daemon().numbers().networkInterfaces.erase(m_number);
    m_uuid.clear();
}

void DeviceNetwork::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder()
                          .add("Connected", !m_uuid.empty())
                          .add("Interface", interface())
                          .add("UUID", m_uuid)
                          .end()));
}

} // namespace Bluetooth::Sim
