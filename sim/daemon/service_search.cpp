// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/service_search.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"

namespace Bluetooth::Sim {

ServiceSearch::Kind ServiceSearch::kindOf(const CallPtr& call) {
    if (!call)
        return Kind::Own;
    if (call->member() == "CreateDevice")
        return Kind::Create;
    return call->member() == "CreatePairedDevice" ? Kind::CreatePaired : Kind::Discover;
}

ServiceSearch::ServiceSearch(ServedDevice& device, CallPtr call, std::string uuid)
    : m_device(device), m_call(std::move(call)), m_kind(kindOf(m_call)), m_uuid(std::move(uuid)) {}

void ServiceSearch::begin() {
    if (m_kind == Kind::Create)
        m_device.adapter().discovery().suspend();
    m_hold = m_device.link().hold();
    m_device.link().connect(m_hold, [this](bool reached) {
        if (reached)
            run();
        else
            notReached();
    });
}

void ServiceSearch::run() {
    const Times& times = m_device.adapter().daemon().times();
    m_timer.start(times.scaled(times.serviceSearch), [this] { finish(); });
}

void ServiceSearch::finish() {
    const Value records = m_device.learnServices(m_uuid);
    if (m_kind == Kind::Discover)
        m_call->reply(tuple(records));
    else if (m_call)
        m_call->reply(tuple(pathValue(m_device.path())));
    if (m_kind == Kind::Create)
        m_device.keep();
    end();
}

void ServiceSearch::notReached() {
    if (m_kind == Kind::Discover)
        m_call->fail(Errors::connectionAttemptFailed("Host is down"));
    else if (m_call)
        m_call->fail(Errors::failed("Host is down"));
    const auto device = m_device.shared_from_this();
    end();
    if (device->temporary() && !device->pairing()) // whose own failure comes next
        device->adapter().forgetDevice(device);
}

void ServiceSearch::cancel() {
    if (m_call)
        m_call->fail(Errors::failed("Operation canceled"));
    if (isCreating())
        m_device.setTemporary(true);
    end();
}

void ServiceSearch::linkLost() {
    if (m_kind == Kind::Create && m_device.temporary())
        return; // it goes with the device
    if (m_kind == Kind::CreatePaired)
        m_call->reply(tuple(pathValue(m_device.path()))); // it is paired, whatever it offers
    else if (m_call)
        m_call->fail(Errors::connectionAttemptFailed("Host is down"));
    end();
}

void ServiceSearch::ownerGone() {
    const auto device = m_device.shared_from_this();
    if (isCreating())
        device->setTemporary(true);
    end();
    if (device->temporary() && !device->link().up() && !device->pairing())
        device->adapter().forgetDevice(device);
}

void ServiceSearch::abandon() {
    m_timer.stop();
    m_hold.release();
}

void ServiceSearch::end() {
    AdapterDiscovery& discovery = m_device.adapter().discovery();
    const bool suspended = m_kind == Kind::Create;
    abandon();
    m_device.searchEnded();
    if (suspended)
        discovery.resume();
}

} // namespace Bluetooth::Sim
