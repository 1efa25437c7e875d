#include "daemon/manager.h"

#include "bus/dict.h"
#include "daemon/adapter.h"
#include "daemon/daemon.h"

namespace Bluetooth::Sim {

const Interface& Manager::table() {
    static const Interface table = {
        "org.bluez.Manager",
        {{"GetProperties", {}, {{"properties", "a{sv}"}}, handle<&Manager::getProperties>},
         {"DefaultAdapter", {}, {{"adapter", "o"}}, handle<&Manager::defaultAdapter>},
         {"FindAdapter", {{"pattern", "s"}}, {{"adapter", "o"}}, handle<&Manager::findAdapter>},
         {"ListAdapters", {}, {{"adapters", "ao"}}, handle<&Manager::listAdapters>}},
        {{"PropertyChanged", {{"name", "s"}, {"value", "v"}}},
         {"AdapterAdded", {{"adapter", "o"}}},
         {"AdapterRemoved", {{"adapter", "o"}}},
         {"DefaultAdapterChanged", {{"adapter", "o"}}}}};
    return table;
}

Manager::Manager(Daemon& daemon) : daemon_(daemon) {
    daemon_.objects().add("/", table(), this);
}

Manager::~Manager() {
    daemon_.objects().remove("/");
}

void Manager::getProperties(const CallPtr& call) {
    call->reply(tuple(Dict().add("Adapters", adapterPaths()).end()));
}

void Manager::defaultAdapter(const CallPtr& call) {
    if (daemon_.adapters().empty())
        return call->fail(Errors::noSuchAdapter());
    call->reply(tuple(pathValue(daemon_.adapters().front()->path())));
}

void Manager::findAdapter(const CallPtr& call) {
    const std::string pattern = call->text(0);
    if (pattern == "any")
        return call->reply(tuple(pathValue(daemon_.basePath() + "/any")));
    const Adapter* adapter = daemon_.find(pattern);
    if (!adapter)
        return call->fail(Errors::noSuchAdapter());
    call->reply(tuple(pathValue(adapter->path())));
}

void Manager::listAdapters(const CallPtr& call) {
    call->reply(tuple(adapterPaths()));
}

Value Manager::adapterPaths() const {
    std::vector<std::string> paths;
    for (const auto& adapter : daemon_.adapters())
        paths.push_back(adapter->path());
    return listValue("o", paths);
}

void Manager::emit(const char* member, const Value& arguments) {
    daemon_.bus().emit("/", table().name, member, arguments);
}

void Manager::adaptersChanged() {
    emit("PropertyChanged", g_variant_new("(sv)", "Adapters", adapterPaths().get()));
}

void Manager::adapterAdded(const Adapter& adapter) {
    emit("AdapterAdded", tuple(pathValue(adapter.path())));
    adaptersChanged();
    if (daemon_.adapters().size() == 1)
        emit("DefaultAdapterChanged", tuple(pathValue(adapter.path())));
}

void Manager::adapterRemoved(const std::string& path, bool wasDefault) {
    adaptersChanged();
    if (wasDefault && !daemon_.adapters().empty())
        emit("DefaultAdapterChanged", tuple(pathValue(daemon_.adapters().front()->path())));
    emit("AdapterRemoved", tuple(pathValue(path)));
}

} // namespace Bluetooth::Sim
