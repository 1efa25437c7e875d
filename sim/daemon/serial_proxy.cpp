// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/serial_proxy.h"

#include "daemon/bluetoothd.h"
#include "daemon/device_services.h"
#include "daemon/serial_proxies.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bus/dict_builder.h"

namespace Bluetooth::Sim {

SerialProxy::SerialProxy(SerialProxies& proxies, std::string path, std::string owner,
                         std::string uuid, LocalEnd local)
    : m_proxies(proxies),
      m_path(std::move(path)),
      m_owner(std::move(owner)),
      m_uuid(std::move(uuid)),
      m_local(std::move(local)) {
    m_proxies.daemon().objects().add(m_path, serialProxyInterface<SerialProxy>(), this);
}

/// A proxy that is removed while it is enabled leaves its record behind, as the daemon's does.
SerialProxy::~SerialProxy() {
    disconnect();
    m_proxies.daemon().objects().remove(m_path);
}

void SerialProxy::enable(const CallPtr& call) {
    if (m_enabled)
        return call->fail(Errors::failed("Operation already in progress"));
    const int channel = m_proxies.freeChannel();
    if (channel == 0)
        return call->fail(Errors::failed("Input/output error"));
    Bluetoothd& daemon = m_proxies.daemon();
    daemon.changeRecords([&] {
        m_enabled = true;
        m_channel = channel;
        m_record = daemon.records().add({m_proxies.adapterId(), m_uuid, m_owner});
        call->reply();
    });
}

void SerialProxy::disable(const CallPtr& call) {
    if (!m_enabled)
        return call->fail(Errors::failed("Not enabled"));
    m_enabled = false;
    disconnect();
    Bluetoothd& daemon = m_proxies.daemon();
    daemon.changeRecords([&] {
        daemon.records().remove(m_record);
        call->reply();
    });
}

void SerialProxy::connect(ServedDevice& device) {
    if (!m_line.expired())
        return;
    const int local = m_local.open();
    if (local < 0)
        return;
    m_device = device.address();
    m_line = device.services().serial().connectTo(local, m_uuid);
}

void SerialProxy::disconnect() {
    if (const auto line = m_line.lock())
        line->close();
}

void SerialProxy::getInfo(const CallPtr& call) {
    const bool connected = !m_line.expired();
    DictBuilder info;
    info.add("uuid", m_uuid).add("address", address());
    if (m_channel)
        info.add("channel", static_cast<guint8>(m_channel));
    info.add("enabled", m_enabled).add("connected", connected);
    if (connected)
        info.add("address", m_device); // the key is there twice: the daemon's mistake
    call->reply(tuple(info.end()));
}

void SerialProxy::setSerialParameters(const CallPtr& call) {
    if (!m_line.expired())
        return call->fail(Errors::notAuthorized);
    const auto byte = [&](gsize index) {
        return static_cast<unsigned>(g_variant_get_byte(call->argument(index).get()));
    };
    LocalEnd changed = m_local; // all of them, or none
    if (!changed.setRate(call->text(0)) || !changed.setDataBits(byte(1)) ||
        !changed.setStopBits(byte(2)) || !changed.setParity(call->text(3)))
        return call->fail(Errors::invalidArguments);
    m_local = changed;
    call->reply();
}

} // namespace Bluetooth::Sim
