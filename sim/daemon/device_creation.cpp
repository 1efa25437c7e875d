#include "daemon/device_creation.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/daemon.h"
#include "daemon/device.h"

namespace Bluetooth::Sim {

void DeviceCreation::begin() {
    device_.adapter().discovery().suspend();
    device_.link().hold();
    device_.link().connect([this](bool reached) {
        if (reached)
            search();
        else
            fail("Host is down");
    });
}

void DeviceCreation::search() {
    const Times& times = device_.adapter().daemon().times();
    timer_.start(times.scaled(times.serviceSearch), [this] { succeed(); });
}

void DeviceCreation::succeed() {
    Adapter& adapter = device_.adapter();
    device_.learnServices();
    device_.setTemporary(false);
    device_.stored().known = true;
    call_->reply(tuple(pathValue(device_.path())));
    device_.link().release();
    device_.creationEnded();
    adapter.discovery().resume();
}

void DeviceCreation::fail(const char* text) {
    call_->fail(Errors::failed(text));
    removeDevice();
}

void DeviceCreation::removeDevice() {
    Adapter& adapter = device_.adapter();
    timer_.stop();
    adapter.removeDevice(device_.shared_from_this());
    adapter.discovery().resume();
}

void DeviceCreation::cancel(const CallPtr& call) {
    const CallPtr creating = call_;
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
