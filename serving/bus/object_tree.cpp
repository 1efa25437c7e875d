// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/bus/object_tree.h"

namespace Bluetooth::Serving {

namespace {

constexpr const char* introspectable = "org.freedesktop.DBus.Introspectable";

BusError unknown(const Call& call, bool objectExists) {
    const std::string interface = call.interface().empty() ? "(null)" : call.interface();
    return {std::string("org.freedesktop.DBus.Error.") +
                (objectExists ? "UnknownMethod" : "UnknownObject"),
            "Method \"" + call.member() + "\" with signature \"" + call.signature() +
                "\" on interface \"" + interface + "\" doesn't exist\n"};
}

} // namespace

void ObjectTree::add(const std::string& path, const Interface& interface, void* object) {
    m_objects[path].push_back({&interface, object});
}

void ObjectTree::remove(const std::string& path) {
    m_objects.erase(path);
}

void ObjectTree::dispatch(const CallPtr& call) const {
    if (call->interface() == introspectable && call->member() == "Introspect")
        return introspect(call);
    const auto object = m_objects.find(call->path());
    if (object == m_objects.end())
        return call->fail(unknown(*call, !childrenOf(call->path()).empty()));
    for (const Served& served : object->second) {
        if (call->interface() != served.interface->name)
            continue;
        if (const MethodEntry* method = served.interface->find(call->member(), call->signature())) {
            // The handler may remove the object: nothing of the tree is used after it.
            const Handler handler = method->handler;
            return handler(served.object, call);
        }
    }
    call->fail(unknown(*call, true));
}

void ObjectTree::introspect(const CallPtr& call) const {
    const auto object = m_objects.find(call->path());
    const std::vector<std::string> children = childrenOf(call->path());
    if (object == m_objects.end() && children.empty())
        return call->fail(unknown(*call, false));

    std::string xml = "<!DOCTYPE node PUBLIC \"-//freedesktop//DTD D-BUS Object Introspection "
                      "1.0//EN\"\n\"http://www.freedesktop.org/standards/dbus/1.0/"
                      "introspect.dtd\">\n<node>\n";
    xml += std::string("\t<interface name=\"") + introspectable +
           "\">\n\t\t<method name=\"Introspect\">\n\t\t\t<arg name=\"xml\" type=\"s\" "
           "direction=\"out\"/>\n\t\t</method>\n\t</interface>\n";
    if (object != m_objects.end())
        for (const Served& served : object->second)
            xml += served.interface->introspection();
    for (const std::string& child : children)
        xml += "\t<node name=\"" + child + "\"/>\n";
    call->reply(tuple(xml + "</node>\n"));
}

std::vector<std::string> ObjectTree::childrenOf(const std::string& path) const {
    const std::string prefix = path == "/" ? path : path + "/";
    std::vector<std::string> children;
    for (const auto& [other, served] : m_objects) {
        if (other.size() <= prefix.size() || other.compare(0, prefix.size(), prefix) != 0)
            continue;
        std::string child =
            other.substr(prefix.size(), other.find('/', prefix.size()) - prefix.size());
        if (children.empty() || children.back() != child)
            children.push_back(std::move(child));
    }
    return children;
}

} // namespace Bluetooth::Serving
