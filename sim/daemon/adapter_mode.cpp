#include "daemon/adapter_mode.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/agent.h"
#include "daemon/daemon.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr guint32 kLimitedDiscoverable = 0x2000;

guint32 number(const Value& value) {
    return g_variant_get_uint32(value.get());
}

bool flag(const Value& value) {
    return g_variant_get_boolean(value.get()) != FALSE;
}

} // namespace

AdapterMode::AdapterMode(Adapter& adapter) : adapter_(adapter) {}

bool AdapterMode::pairable() const {
    return adapter_.hardware().pairable;
}

bool AdapterMode::limited() const {
    return discoverable_ && adapter_.hardware().discoverableTimeout != 0;
}

guint32 AdapterMode::deviceClass() const {
    return adapter_.hardware().deviceClass | (limited() ? kLimitedDiscoverable : 0);
}

void AdapterMode::comeUp() {
    if (!adapter_.hardware().powered)
        return;
    powered_ = true;
    adapter_.changed("Powered", boolValue(true));
    adapter_.changed("Pairable", boolValue(pairable()));
    adapter_.changed("Class", g_variant_new_uint32(deviceClass()));
    adapter_.changed("Name", textValue(adapter_.hardware().name));
    adapter_.changed("Pairable", boolValue(pairable()));
    discoverable_ = adapter_.hardware().discoverable;
    adapter_.changed("Discoverable", boolValue(discoverable_));
    startDiscoverableTimeout();
}

void AdapterMode::goDown() {
    if (powered_)
        powerOff();
    sessions_.clear();
}

void AdapterMode::powerOn() {
    powered_ = true;
    adapter_.hardware().powered = true;
    adapter_.changed("Powered", boolValue(true));
    adapter_.changed("Pairable", boolValue(pairable()));
}

void AdapterMode::powerOff() {
    adapter_.loseDevices();
    restoreDiscoverable_ = discoverable_;
    discoverableTimer_.stop();
    pairableTimer_.stop();
    if (discoverable_) {
        discoverable_ = false;
        adapter_.changed("Discoverable", boolValue(false));
    }
    // Only the signal says so: GetProperties keeps the value that the next power-on brings back.
    adapter_.changed("Pairable", boolValue(false));
    adapter_.discovery().stop();
    powered_ = false;
    adapter_.changed("Powered", boolValue(false));
    powerFromSession_ = false;
}

void AdapterMode::setPowered(const CallPtr& call, const Value& value) {
    if (flag(value) == powered_)
        return call->reply();
    if (powered_) {
        powerOff();
        adapter_.hardware().powered = false;
        sessions_.clear();
    } else {
        powerOn();
        adapter_.changed("Class", g_variant_new_uint32(deviceClass()));
        adapter_.changed("Pairable", boolValue(pairable()));
        discoverable_ = restoreDiscoverable_;
        adapter_.changed("Discoverable", boolValue(discoverable_));
        startDiscoverableTimeout();
    }
    call->reply();
}

void AdapterMode::setDiscoverable(const CallPtr& call, const Value& value) {
    const bool wanted = flag(value);
    if (wanted == discoverable_)
        return call->reply();
    if (wanted && !powered_)
        powerOn();
    const bool wasLimited = limited();
    discoverable_ = wanted;
    adapter_.hardware().discoverable = wanted;
    adapter_.changed("Discoverable", boolValue(wanted));
    startDiscoverableTimeout();
    call->reply();
    classChangedFrom(wasLimited);
}

void AdapterMode::setPairable(const CallPtr& call, const Value& value) {
    if (flag(value) == pairable())
        return call->reply();
    adapter_.hardware().pairable = flag(value);
    adapter_.changed("Pairable", value);
    startPairableTimeout();
    call->reply();
}

void AdapterMode::setDiscoverableTimeout(const CallPtr& call, const Value& value) {
    if (number(value) == adapter_.hardware().discoverableTimeout)
        return call->reply();
    const bool wasLimited = limited();
    adapter_.hardware().discoverableTimeout = number(value);
    adapter_.changed("DiscoverableTimeout", value);
    startDiscoverableTimeout();
    call->reply();
    classChangedFrom(wasLimited);
}

void AdapterMode::setPairableTimeout(const CallPtr& call, const Value& value) {
    if (number(value) == adapter_.hardware().pairableTimeout)
        return call->reply();
    adapter_.hardware().pairableTimeout = number(value);
    adapter_.changed("PairableTimeout", value);
    startPairableTimeout();
    call->reply();
}

void AdapterMode::startDiscoverableTimeout() {
    discoverableTimer_.stop();
    const guint32 seconds = adapter_.hardware().discoverableTimeout;
    if (!discoverable_ || seconds == 0)
        return;
    discoverableTimer_.start(adapter_.daemon().times().scaledSeconds(seconds), [this] {
        const bool wasLimited = limited();
        discoverable_ = false;
        adapter_.hardware().discoverable = false;
        adapter_.changed("Discoverable", boolValue(false));
        classChangedFrom(wasLimited);
    });
}

void AdapterMode::startPairableTimeout() {
    pairableTimer_.stop();
    const guint32 seconds = adapter_.hardware().pairableTimeout;
    if (!powered_ || !pairable() || seconds == 0)
        return;
    pairableTimer_.start(adapter_.daemon().times().scaledSeconds(seconds), [this] {
        adapter_.hardware().pairable = false;
        adapter_.changed("Pairable", boolValue(false));
    });
}

void AdapterMode::classChangedFrom(bool wasLimited) {
    if (limited() != wasLimited)
        adapter_.changed("Class", g_variant_new_uint32(deviceClass()));
}

void AdapterMode::requestSession(const CallPtr& call) {
    Agent* agent = adapter_.agent();
    if (!agent)
        return call->fail(Errors::agentNotAvailable());
    if (powered_) {
        sessions_.push_back(call->sender());
        return call->reply();
    }
    if (agent->busy())
        return call->fail(Errors::failed("Device or resource busy"));
    const char* mode = restoreDiscoverable_ ? "discoverable" : "connectable";
    agent->ask("ConfirmModeChange", tuple(textValue(mode)), "",
               adapter_.daemon().times().agentTimeout, [this, call](const Answer& answer) {
                   if (answer.failed)
                       return call->fail(answer.error);
                   sessions_.push_back(call->sender());
                   powerFromSession_ = true;
                   const Value on = boolValue(true);
                   setPowered(call, on);
               });
}

void AdapterMode::releaseSession(const CallPtr& call) {
    const auto session = std::find(sessions_.begin(), sessions_.end(), call->sender());
    if (session == sessions_.end())
        return call->fail(Errors::failed("Invalid Session"));
    sessions_.erase(session);
    call->reply();
    sessionEnded();
}

void AdapterMode::clientGone(const std::string& client) {
    const auto end = std::remove(sessions_.begin(), sessions_.end(), client);
    if (end == sessions_.end())
        return;
    sessions_.erase(end, sessions_.end());
    sessionEnded();
}

void AdapterMode::sessionEnded() {
    if (!sessions_.empty() || !powerFromSession_ || !powered_)
        return;
    powerOff();
    adapter_.hardware().powered = false;
}

} // namespace Bluetooth::Sim
