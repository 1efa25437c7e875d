// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/device_creation.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"

namespace Bluetooth::Sim {

void DeviceCreation::begin() {
    m_device.adapter().discovery().suspend();
    m_hold = m_device.link().hold();
    m_device.link().connect([this](bool reached) {
        if (reached)
            search();
        else
            fail("Host is down");
    });
}

void DeviceCreation::search() {
    const Times& times = m_device.adapter().daemon().times();
    m_timer.start(times.scaled(times.serviceSearch), [this] { succeed(); });
}

void DeviceCreation::succeed() {
    ServedAdapter& adapter = m_device.adapter();
    m_device.learnServices();
    m_device.setTemporary(false);
    m_device.stored().known = true;
    m_call->reply(tuple(pathValue(m_device.path())));
    m_hold.release();
    m_device.creationEnded();
    adapter.discovery().resume();
}

void DeviceCreation::fail(const char* text) {
    m_call->fail(Errors::failed(text));
    removeDevice();
}

void DeviceCreation::removeDevice() {
    ServedAdapter& adapter = m_device.adapter();
    adapter.forgetDevice(m_device.shared_from_this());
    adapter.discovery().resume();
}

void DeviceCreation::abandon() {
    m_timer.stop();
    m_hold.release();
}

void DeviceCreation::cancel(const CallPtr& call) {
    const CallPtr creating = m_call;
    removeDevice();
    creating->fail(Errors::failed("Operation canceled"));
    call->reply();
}

void DeviceCreation::linkLost() {
    fail("Host is down");
}

void DeviceCreation::ownerGone() {
    removeDevice();
}

} // namespace Bluetooth::Sim
