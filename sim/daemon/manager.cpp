#include "daemon/manager.h"

#include "daemon/adapter.h"
#include "daemon/daemon.h"
#include "serving/bluez4/errors.h"
#include "serving/bluez4/properties.h"
#include "serving/bus/dict_builder.h"

namespace Bluetooth::Sim {

Manager::Manager(Daemon& daemon) : m_daemon(daemon) {
    m_daemon.objects().add("/", managerInterface<Manager>(), this);
}

Manager::~Manager() {
    m_daemon.objects().remove("/");
}

void Manager::getProperties(const CallPtr& call) {
    call->reply(tuple(DictBuilder().add("Adapters", adapterPaths()).end()));
}

void Manager::defaultAdapter(const CallPtr& call) {
    if (m_daemon.adapters().empty())
        return call->fail(Errors::noSuchAdapter);
    call->reply(tuple(pathValue(m_daemon.adapters().front()->path())));
}

void Manager::findAdapter(const CallPtr& call) {
    const std::string pattern = call->text(0);
    if (pattern == "any")
        return call->reply(tuple(pathValue(m_daemon.basePath() + "/any")));
    const Adapter* adapter = m_daemon.find(pattern);
    if (!adapter)
        return call->fail(Errors::noSuchAdapter);
    call->reply(tuple(pathValue(adapter->path())));
}

void Manager::listAdapters(const CallPtr& call) {
    call->reply(tuple(adapterPaths()));
}

Value Manager::adapterPaths() const {
    std::vector<std::string> paths;
    for (const auto& adapter : m_daemon.adapters())
        paths.push_back(adapter->path());
    return listValue("o", paths);
}

void Manager::emit(const char* member, const Value& arguments) {
    m_daemon.bus().emit("/", Interfaces::manager, member, arguments);
}

void Manager::adaptersChanged() {
    emit("PropertyChanged", propertyChange("Adapters", adapterPaths()));
}

void Manager::adapterAdded(const Adapter& adapter) {
    emit("AdapterAdded", tuple(pathValue(adapter.path())));
    adaptersChanged();
    if (m_daemon.adapters().size() == 1)
        emit("DefaultAdapterChanged", tuple(pathValue(adapter.path())));
}

void Manager::adapterRemoved(const std::string& path, bool wasDefault) {
    adaptersChanged();
    if (wasDefault && !m_daemon.adapters().empty())
        emit("DefaultAdapterChanged", tuple(pathValue(m_daemon.adapters().front()->path())));
    emit("AdapterRemoved", tuple(pathValue(path)));
}

} // namespace Bluetooth::Sim
