// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/served_manager.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

#include <algorithm>
#include <cstdlib>

namespace Bluetooth::Sim {

ServedManager::ServedManager(Bluetoothd& daemon) : m_daemon(daemon) {
    m_daemon.objects().add("/", managerInterface<ServedManager>(), this);
}

ServedManager::~ServedManager() {
    m_daemon.objects().remove("/");
}

void ServedManager::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("Adapters", adapterPaths()).end()));
}

void ServedManager::defaultAdapter(const CallPtr& call) {
    if (m_default.empty())
        return call->fail(Errors::noSuchAdapter);
    call->reply(tuple(pathValue(m_default)));
}

void ServedManager::findAdapter(const CallPtr& call) {
    const std::string pattern = call->text(0);
    if (pattern == "any" || pattern == "00:00:00:00:00:00")
        return call->reply(tuple(pathValue(m_daemon.basePath() + "/any")));
    // What follows "hci" is read as a number, up to where it is none: "hciX" is hci0.
    const bool isName = pattern.size() > 3 && pattern.compare(0, 3, "hci") == 0;
    const ServedAdapter* adapter = m_daemon.find(
        isName ? "hci" + std::to_string(std::strtol(pattern.c_str() + 3, nullptr, 10)) : pattern);
    if (!adapter)
        return call->fail(Errors::noSuchAdapter);
    call->reply(tuple(pathValue(adapter->path())));
}

void ServedManager::listAdapters(const CallPtr& call) {
    call->reply(tuple(adapterPaths()));
}

Value ServedManager::adapterPaths() const {
    std::vector<std::string> paths;
    for (const auto& adapter : m_daemon.adapters())
        paths.push_back(adapter->path());
    return listValue("o", paths);
}

void ServedManager::emit(const char* member, const Value& arguments) {
    m_daemon.bus().emit("/", Interfaces::manager, member, arguments);
}

void ServedManager::adaptersChanged() {
    emit("PropertyChanged", propertyChange("Adapters", adapterPaths()));
}

void ServedManager::setDefault(const ServedAdapter& adapter) {
    m_default = adapter.path();
    emit("DefaultAdapterChanged", tuple(pathValue(m_default)));
}

void ServedManager::adapterAdded(const ServedAdapter& adapter) {
    emit("AdapterAdded", tuple(pathValue(adapter.path())));
    adaptersChanged();
    if (m_default.empty())
        setDefault(adapter);
}

void ServedManager::adapterRemoved(const ServedAdapter& adapter) {
    adaptersChanged();
    if (m_default.empty() || m_default == adapter.path()) {
        // The kernel lists its controllers the last one first, and only those that are on count.
        const auto& all = m_daemon.adapters();
        const auto next = std::find_if(all.rbegin(), all.rend(),
                                       [](const auto& other) { return other->mode().powered(); });
        m_default.clear();
        if (next != all.rend())
            setDefault(**next);
    }
    emit("AdapterRemoved", tuple(pathValue(adapter.path())));
}

} // namespace Bluetooth::Sim
