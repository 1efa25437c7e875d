// SPDX-License-Identifier: LGPL-2.1-or-later
#include "serving/bus/interface.h"

#include <algorithm>

namespace Bluetooth::Serving {

namespace {

void describe(std::string& xml, const Arguments& arguments, const char* direction) {
    for (const Argument& argument : arguments) {
        xml += std::string("\t\t\t<arg name=\"") + argument.name + "\" type=\"" + argument.type;
        xml += *direction ? std::string("\" direction=\"") + direction + "\"/>\n" : "\"/>\n";
    }
}

void open(std::string& xml, const char* element, const char* name) {
    xml += std::string("\t\t<") + element + " name=\"" + name + "\">\n";
}

void close(std::string& xml, const char* element, bool deprecated) {
    if (deprecated)
        xml += "\t\t\t<annotation name=\"org.freedesktop.DBus.Deprecated\" value=\"true\"/>\n";
    xml += std::string("\t\t</") + element + ">\n";
}

} // namespace

std::string MethodEntry::inSignature() const {
    std::string signature;
    for (const Argument& argument : in)
        signature += argument.type;
    return signature;
}

const MethodEntry* Interface::find(const std::string& member, const std::string& signature) const {
    const auto found = std::find_if(methods.begin(), methods.end(), [&](const MethodEntry& method) {
        return member == method.name && signature == method.inSignature();
    });
    return found == methods.end() ? nullptr : &*found;
}

std::string Interface::introspection() const {
    std::string xml = std::string("\t<interface name=\"") + name + "\">\n";
    for (const MethodEntry& method : methods) {
        open(xml, "method", method.name);
        describe(xml, method.in, "in");
        describe(xml, method.out, "out");
        close(xml, "method", method.deprecated);
    }
    for (const SignalEntry& signal : signals) {
        open(xml, "signal", signal.name);
        describe(xml, signal.arguments, "");
        close(xml, "signal", signal.deprecated);
    }
    return xml + "\t</interface>\n";
}

} // namespace Bluetooth::Serving
