// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/served_manager.h"

#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

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
    if (m_daemon.adapters().empty())
        return call->fail(Errors::noSuchAdapter);
    call->reply(tuple(pathValue(m_daemon.adapters().front()->path())));
}

void ServedManager::findAdapter(const CallPtr& call) {
    const std::string pattern = call->text(0);
    if (pattern == "any")
        return call->reply(tuple(pathValue(m_daemon.basePath() + "/any")));
    const ServedAdapter* adapter = m_daemon.find(pattern);
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

void ServedManager::adapterAdded(const ServedAdapter& adapter) {
    emit("AdapterAdded", tuple(pathValue(adapter.path())));
    adaptersChanged();
    if (m_daemon.adapters().size() == 1)
        emit("DefaultAdapterChanged", tuple(pathValue(adapter.path())));
}

void ServedManager::adapterRemoved(const std::string& path, bool wasDefault) {
    adaptersChanged();
    if (wasDefault && !m_daemon.adapters().empty())
        emit("DefaultAdapterChanged", tuple(pathValue(m_daemon.adapters().front()->path())));
    emit("AdapterRemoved", tuple(pathValue(path)));
}

} // namespace Bluetooth::Sim
