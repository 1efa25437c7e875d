// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/serial_proxies.h"

#include "daemon/authorization.h"
#include "daemon/bluetoothd.h"
#include "daemon/serial_proxy.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "daemon/service_records.h"
#include "serving/bluez4/errors.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

constexpr int lastChannel = 30;

} // namespace

SerialProxies::SerialProxies(ServedAdapter& adapter) : m_adapter(adapter) {
    daemon().objects().add(m_adapter.path(), serialProxyManagerInterface<SerialProxies>(), this);
}

SerialProxies::~SerialProxies() = default;

Bluetoothd& SerialProxies::daemon() const {
    return m_adapter.daemon();
}

std::string SerialProxies::adapterId() const {
    return m_adapter.hardware().id();
}

int SerialProxies::freeChannel() const {
    for (int channel = 1; channel <= lastChannel; ++channel) {
        const auto uses = [&](const auto& proxy) {
            return proxy->enabled() && proxy->channel() == channel;
        };
        if (std::none_of(m_proxies.begin(), m_proxies.end(), uses))
            return channel;
    }
    return 0;
}

void SerialProxies::emit(const char* member, const std::string& path) {
    daemon().bus().emit(m_adapter.path(), Interfaces::serialProxyManager, member, tuple(path));
}

void SerialProxies::createProxy(const CallPtr& call) {
    const std::string uuid = serviceNamed(call->text(0));
    const std::string address = call->text(1);
    auto local = LocalEnd::at(address);
    if (uuid.empty() || !local)
        return call->fail(Errors::invalidArguments);
    const auto has = [&](const auto& proxy) { return proxy->address() == address; };
    if (std::any_of(m_proxies.begin(), m_proxies.end(), has))
        return call->fail(Errors::alreadyExists);
    const std::string path =
        m_adapter.path() + "/proxy" + std::to_string(daemon().numbers().nextProxy++);
    m_proxies.push_back(
        std::make_unique<SerialProxy>(*this, path, call->sender(), uuid, std::move(*local)));
    emit("ProxyCreated", path);
    call->reply(tuple(path));
}

void SerialProxies::listProxies(const CallPtr& call) {
    std::vector<std::string> paths;
    for (const auto& proxy : m_proxies)
        paths.push_back(proxy->path());
    call->reply(tuple(listValue("s", paths)));
}

SerialProxies::Proxies::const_iterator SerialProxies::find(const std::string& path) const {
    return std::find_if(m_proxies.begin(), m_proxies.end(),
                        [&](const auto& proxy) { return proxy->path() == path; });
}

void SerialProxies::removeProxy(const CallPtr& call) {
    const auto proxy = find(call->text(0));
    if (proxy == m_proxies.end())
        return call->fail(Errors::doesNotExist);
    if ((*proxy)->owner() != call->sender())
        return call->fail(Errors::notAuthorized);
    remove(proxy);
    call->reply();
}

void SerialProxies::remove(Proxies::const_iterator proxy) {
    emit("ProxyRemoved", (*proxy)->path());
    m_proxies.erase(proxy);
}

bool SerialProxies::peerConnects(ServedDevice& device, const std::string& uuid) {
    const auto proxy = std::find_if(m_proxies.begin(), m_proxies.end(), [&](const auto& p) {
        return p->enabled() && p->uuid() == uuid;
    });
    if (proxy == m_proxies.end())
        return false;
    if (!device.link().up())
        device.comeIn(false);
    authorize(device, uuid, [this, path = (*proxy)->path(), &device](bool allowed) {
        const auto still = find(path);
        if (allowed && still != m_proxies.end() && (*still)->enabled() && device.link().up())
            (*still)->connect(device);
    });
    return true;
}

void SerialProxies::retire() {
    m_proxies.clear();
}

void SerialProxies::clientGone(const std::string& client) {
    for (bool gone = true; gone;) {
        const auto proxy = std::find_if(m_proxies.begin(), m_proxies.end(), [&](const auto& other) {
            return other->owner() == client;
        });
        gone = proxy != m_proxies.end();
        if (gone)
            remove(proxy);
    }
}

} // namespace Bluetooth::Sim
