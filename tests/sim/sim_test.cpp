// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

#include <algorithm>
#include <regex>
#include <set>

namespace Bluetooth::Test {

namespace {

std::string joined(const std::string& first, const std::string& second) {
    return second.empty() ? first : first + " " + second;
}

/// What stands for an audio interface in place of the device's path, of which it would not be seen
/// which of its interfaces has signalled.
const std::map<std::string, std::string> audioNames{
    {"org.bluez.Audio", "Audio"},        {"org.bluez.AudioSink", "Sink"},
    {"org.bluez.AudioSource", "Source"}, {"org.bluez.Control", "Control"},
    {"org.bluez.Headset", "Headset"},    {"org.bluez.HandsfreeGateway", "Gateway"}};

/// The beginning of a signal's line.
std::string origin(DBusMessage* signal) {
    const std::string member = dbus_message_get_member(signal);
    const auto audio = audioNames.find(dbus_message_get_interface(signal));
    if (audio == audioNames.end())
        return dbus_message_get_path(signal) + (" " + member);
    return audio->second + (member == "PropertyChanged" ? " " : ".") + member;
}

std::string answerOf(DBusMessage* reply) {
    ScopedError error;
    if (dbus_set_error_from_message(error, reply))
        return std::string("error ") + error.get().name + ": " + error.message();
    return argumentsOf(reply);
}

} // namespace

SimClient::SimClient()
    : m_peer(PrivateBus::address(PrivateBus::Kind::System), "",
             [this](DBusMessage* message) { write(message); }) {
    for (const char* request :
         {"RequestPinCode", "RequestPasskey", "RequestConfirmation", "DisplayPasskey",
          "DisplayPinCode", "Authorize", "ConfirmModeChange", "Cancel", "Release"})
        m_peer.reply(request);
    m_peer.addMatch("type='signal',sender='org.bluez'");
    findBase();
}

std::string SimClient::shorten(std::string text) const {
    for (const auto& [noise, name] : m_replacements)
        text = std::regex_replace(text, noise, name);
    return text;
}

SimClient::Callee SimClient::calleeOf(const Question& question) const {
    const std::size_t dot = question.method.rfind('.');
    const std::string interface = question.method.substr(0, dot);
    const std::string member = question.method.substr(dot + 1);
    if (interface.find('.') != std::string::npos)
        return {interface, "/" + std::regex_replace(interface, std::regex("\\."), "/"), interface,
                member};
    const std::string adapter = m_base + "hci0";
    static const std::set<std::string> ofAdapter{"Adapter", "Media", "NetworkServer",
                                                 "SerialProxyManager", "Service"};
    return {"org.bluez",
            interface == "Manager"          ? "/"
            : ofAdapter.count(interface)    ? adapter
            : interface == "MediaTransport" ? adapter + "/dev_00_11_22_33_44_55/fd0"
                                            : adapter + "/dev_00_11_22_33_44_55",
            "org.bluez." + interface, member};
}

void SimClient::start(const Question& question) {
    const auto [destination, path, interface, member] = calleeOf(question);
    const MessagePtr message(dbus_message_new_method_call(destination.c_str(), path.c_str(),
                                                          interface.c_str(), member.c_str()));
    Writer(message.get(), question.arguments);
    m_peer.run([&, &asked = member](DBusConnection* connection) {
        dbus_uint32_t serial = 0;
        dbus_connection_send(connection, message.get(), &serial);
        m_asked[serial] = asked;
    });
}

std::string SimClient::call(const Question& question, const std::string& path) {
    const Callee callee = calleeOf(question);
    const MessagePtr reply = m_peer
                                 .call(callee.destination, path.empty() ? callee.path : path,
                                       callee.interface, callee.member, question.arguments)
                                 .get();
    return reply ? shorten(answerOf(reply.get())) : "no answer to " + question.method;
}

std::string SimClient::control(Question question) {
    question.method.insert(0, "com.kestrine.bluetooth.Sim.");
    std::string answer = call(question);
    EXPECT_NE(answer.substr(0, 5), "error") << question.method << ": " << answer;
    return answer;
}

Texts SimClient::trace(const Question& question, std::string last) {
    if (last.empty())
        last = "answer " + calleeOf(question).member;
    taken();
    start(question);
    return until(last);
}

Texts SimClient::until(const std::string& beginning) {
    std::size_t end = 0;
    EXPECT_TRUE(m_lines.waitUntil([&](const Texts& all) {
        for (end = m_taken; end < all.size(); ++end) {
            if (all[end].rfind(beginning, 0) == 0)
                return true;
        }
        return false;
    })) << "never came: "
        << beginning;
    return take(std::min(end + 1, m_lines.count()));
}

Texts SimClient::take(std::size_t end) {
    const Texts all = m_lines.events();
    const auto place = [&](std::size_t index) {
        return all.begin() + static_cast<std::ptrdiff_t>(index);
    };
    return {place(std::exchange(m_taken, end)), place(end)};
}

std::string SimClient::findBase() {
    const MessagePtr reply =
        m_peer.call("org.bluez", "/", "org.bluez.Manager", "FindAdapter", with("any")).get();
    const std::string path = reply ? argumentsOf(reply.get()) : "";
    return m_base = path.substr(2, path.rfind('/') - 1);
}

void SimClient::write(DBusMessage* message) {
    const int type = dbus_message_get_type(message);
    std::string line;
    if (type == DBUS_MESSAGE_TYPE_METHOD_CALL) {
        line =
            joined(std::string("agent ") + dbus_message_get_member(message), argumentsOf(message));
    } else if (type == DBUS_MESSAGE_TYPE_SIGNAL) {
        const std::string path = dbus_message_get_path(message);
        if (path.rfind(DBUS_PATH_DBUS, 0) == 0)
            return; // the bus's own
        line = joined(origin(message), argumentsOf(message));
    } else {
        const auto asked = m_asked.find(dbus_message_get_reply_serial(message));
        if (asked == m_asked.end())
            return;
        line = joined("answer " + asked->second, answerOf(message));
    }
    m_lines.add(shorten(line));
}

void SimTest::create(const Settings& settings) {
    add(settings);
    EXPECT_EQ(call({"Adapter.CreateDevice", newDevice}), "o:device");
    taken();
}

Texts SimTest::effectOf(const Question& question) {
    Texts came = trace(question);
    control("ClearFaults"); // answered after all that the call brought about
    return came + taken();
}

void SimTest::leave(std::unique_ptr<SimClient>& other) {
    std::string name;
    other->peer().run([&](DBusConnection* bus) { name = dbus_bus_get_unique_name(bus); });
    other.reset();
    EXPECT_TRUE(peer().waitForOwner(name, false));
    control("ClearFaults");
}

} // namespace Bluetooth::Test
