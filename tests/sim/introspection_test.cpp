// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

#include <fstream>
#include <functional>

namespace Bluetooth::Test {

namespace {

/// Members by interfaces, written as in interfaces.txt, and the child nodes.
struct Node {
    std::map<std::string, std::string> interfaces;
    Texts children;
};

Node parse(const std::string& xml) {
    static const std::regex tags(R"rx(<(/?\w+)(?: name="([^"]*)")?([^>]*)>)rx");
    static const std::regex attributes(R"rx(type="([^"]*)"( direction="out")?)rx");
    Node node;
    std::string interface, member, in, out;
    for (std::sregex_iterator tag(xml.begin(), xml.end(), tags); tag != std::sregex_iterator();
         ++tag) {
        const std::string element = (*tag)[1];
        const std::string name = (*tag)[2];
        const std::string rest = (*tag)[3];
        std::smatch argument;
        if (element == "interface") {
            interface = name;
        } else if (element == "method" || element == "signal") {
            member = (element == "signal" ? "!" : "") + name;
            in = out = "";
        } else if (element == "arg" && std::regex_search(rest, argument, attributes)) {
            (argument[2].matched ? out : in) += argument[1];
        } else if (element == "annotation" && name == "org.freedesktop.DBus.Deprecated") {
            member.insert(0, "~");
        } else if (element == "/method" || element == "/signal") {
            node.interfaces[interface].append(" ").append(member) += "(" + in + ")" + out;
        } else if (element == "node" && !name.empty()) {
            node.children.push_back(name);
        }
    }
    return node;
}

} // namespace

TEST_F(SimTest, EachInterfaceIsIntrospectedAsTheDaemonsOwn) {
    std::map<std::string, std::string> kept;
    std::ifstream file(SIM_INTERFACES);
    for (std::string line; std::getline(file, line);)
        if (line[0] != '#')
            kept[line.substr(0, line.find(' '))] = line.substr(line.find(' '));
    control({"SetAudio", Settings{{"Enable", "Source;Gateway"}}});
    create({{"UUIDs", "1101;1108;110a;110b;110c;110e;1112;1115;1116;111e;111f;1124"}});
    std::map<std::string, std::string> served;
    const std::function<void(const std::string&)> walk = [&](const std::string& path) {
        const MessagePtr reply = peer()
                                     .call("org.bluez", path.empty() ? "/" : path,
                                           "org.freedesktop.DBus.Introspectable", "Introspect")
                                     .get();
        const Node node = parse(argumentsOf(reply.get()));
        served.insert(node.interfaces.begin(), node.interfaces.end());
        for (const std::string& child : node.children)
            walk(path + "/" + child);
    };
    walk("");
    served.erase("org.freedesktop.DBus.Introspectable");
    for (const auto& [name, members] : served)
        EXPECT_EQ(members, kept[name]) << name;
    for (const auto& [name, members] : kept) {
        const bool comesWithUse = name == "org.bluez.MediaTransport" || // a stream
                                  name == "org.bluez.SerialProxy";      // CreateProxy
        EXPECT_TRUE(comesWithUse || served.count(name) == 1) << name;
    }
}

} // namespace Bluetooth::Test
