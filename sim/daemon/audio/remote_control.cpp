// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/remote_control.h"

#include "daemon/audio/device_audio.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

namespace Bluetooth::Sim {

void RemoteControl::connectLater() {
    const Times& times = m_audio.device().adapter().daemon().times();
    m_timer.start(times.scaled(times.controlConnect), [this] { connect(); });
}

void RemoteControl::setConnected(bool connected) {
    m_timer.stop();
    if (m_connected == connected)
        return;
    m_connected = connected;
    m_audio.emit(Interfaces::control, connected ? "Connected" : "Disconnected");
    m_audio.emit(Interfaces::control, "PropertyChanged", propertyChange("Connected", connected));
}

void RemoteControl::isConnected(const CallPtr& call) {
    call->reply(tuple(m_connected));
}

void RemoteControl::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("Connected", m_connected).end()));
}

void RemoteControl::changeVolume(const CallPtr& call) {
    if (!m_connected)
        return call->fail(Errors::notConnected);
    if (!m_audio.has(remoteTarget))
        return call->fail(Errors::notSupported);
    call->reply();
}

} // namespace Bluetooth::Sim
