// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_input.h"

#include "daemon/authorization.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"
#include "world/settings.h"

namespace Bluetooth::Sim {

namespace {

constexpr const char* headset = "1108";
constexpr const char* humanInterface = "1124";

} // namespace

void DeviceInput::serve() {
    if (m_served || !(m_device.offers(humanInterface) || m_device.offers(headset)))
        return;
    m_served = true;
    m_device.adapter().daemon().objects().add(m_device.path(), inputInterface<DeviceInput>(), this);
}

void DeviceInput::setConnected(bool connected) {
    if (m_connected == connected)
        return;
    m_connected = connected;
    m_device.adapter().daemon().bus().emit(m_device.path(), Interfaces::input, "PropertyChanged",
                                           propertyChange("Connected", connected));
}

void DeviceInput::connect(const CallPtr& call) {
    if (!m_device.offers(humanInterface))
        return call->fail(Errors::notSupported);
    if (m_call)
        return call->fail(Errors::inProgress);
    if (m_connected)
        return call->fail(Errors::alreadyConnected);
    m_call = call;
    m_channel.open(serviceOf(fullUuid(humanInterface)), [this](const char* failure) {
        const CallPtr waiting = std::move(m_call);
        if (failure)
            return waiting->fail(Errors::failed(failure));
        setConnected(true);
        waiting->reply();
    });
}

void DeviceInput::disconnect(const CallPtr& call) {
    if (!m_connected) {
        // As the daemon does: Connect is given up and not answered, nor is another one taken.
        m_channel.close();
        return call->fail(Errors::failed("Transport endpoint is not connected"));
    }
    call->reply();
    disconnected();
}

void DeviceInput::disconnected() {
    m_channel.linkLost();
    setConnected(false);
}

void DeviceInput::peerConnects() {
    if (m_connected || m_channel.opening())
        return;
    if (!m_device.link().up())
        m_device.comeIn(false);
    authorize(m_device, fullUuid(humanInterface), [this](bool allowed) {
        if (!allowed || m_connected || !m_device.link().up())
            return;
        m_channel.accept();
        setConnected(true);
    });
}

void DeviceInput::abandon() {
    m_call.reset();
    m_channel.close();
}

void DeviceInput::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("Connected", m_connected).end()));
}

} // namespace Bluetooth::Sim
