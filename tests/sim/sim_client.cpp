#include "sim/sim_client.h"

#include "support/latch.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>

namespace Bluetooth::Test {

namespace {

constexpr const char* daemonName = "org.bluez";
constexpr const char* controlName = "com.kestrine.bluetooth.Sim";
constexpr const char* controlPath = "/com/kestrine/bluetooth/Sim";

bool begins(const std::string& text, const std::string& beginning) {
    return text.compare(0, beginning.size(), beginning) == 0;
}

/// Paths without the daemon's prefix, and without GVariant's type names.
std::string shorten(std::string text) {
    const auto erase = [&](const std::string& what) {
        for (auto at = text.find(what); at != std::string::npos; at = text.find(what))
            text.erase(at, what.size());
    };
    for (const char* type :
         {"objectpath ", "@as ", "@ao ", "@av ", "uint32 ", "uint16 ", "int16 ", "byte "})
        erase(type);
    for (auto at = text.find("/org/bluez/"); at != std::string::npos;
         at = text.find("/org/bluez/")) {
        const auto end = text.find('/', at + 11);
        text.erase(at, end == std::string::npos ? end : end + 1 - at);
    }
    return text;
}

std::string print(GVariant* value) {
    char* text = g_variant_print(value, FALSE);
    std::string result = shorten(text);
    g_free(text);
    return result;
}

/// The arguments with spaces between them.
std::string printBody(GDBusMessage* message) {
    GVariant* body = g_dbus_message_get_body(message);
    std::string text;
    for (gsize i = 0; body && i < g_variant_n_children(body); ++i) {
        GVariant* child = g_variant_get_child_value(body, i);
        text += " " + print(child);
        g_variant_unref(child);
    }
    return text;
}

std::string last(const char* path) {
    const std::string text = path;
    return text == "/" ? text : text.substr(text.rfind('/') + 1);
}

} // namespace

SimClient::SimClient() {
    GError* error = nullptr;
    const auto flags =
        static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                          G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
    m_connection = g_dbus_connection_new_for_address_sync(std::getenv("DBUS_SYSTEM_BUS_ADDRESS"),
                                                          flags, nullptr, nullptr, &error);
    if (!m_connection)
        throw std::runtime_error(error->message);
    m_filter = g_dbus_connection_add_filter(m_connection, onMessage, this, nullptr);
    call("", "org.freedesktop.DBus.AddMatch", "(\"type='signal',sender='org.bluez'\",)");
}

SimClient::~SimClient() {
    g_dbus_connection_close_sync(m_connection, nullptr, nullptr);
    g_dbus_connection_remove_filter(m_connection, m_filter);
    g_object_unref(m_connection);
}

std::string SimClient::uniqueName() const {
    return g_dbus_connection_get_unique_name(m_connection);
}

guint32 SimClient::send(const std::string& destination, const std::string& path,
                        const std::string& method, const std::string& arguments,
                        const std::string& label) {
    const auto dot = method.rfind('.');
    GDBusMessage* message = g_dbus_message_new_method_call(destination.c_str(), path.c_str(),
                                                           method.substr(0, dot).c_str(),
                                                           method.substr(dot + 1).c_str());
    GVariant* body = g_variant_parse(nullptr, arguments.c_str(), nullptr, nullptr, nullptr);
    EXPECT_NE(body, nullptr) << arguments;
    g_dbus_message_set_body(message, body);
    g_variant_unref(body);
    guint32 serial = 0;
    {
        const std::lock_guard<std::mutex> lock(m_mutex);
        g_dbus_connection_send_message(m_connection, message, G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                       &serial, nullptr);
        m_labels[serial] = label;
    }
    g_object_unref(message);
    return serial;
}

void SimClient::start(const std::string& label, const std::string& path, const std::string& method,
                      const std::string& arguments) {
    send(daemonName, path, "org.bluez." + method, arguments, label);
}

std::string SimClient::call(const std::string& path, const std::string& method,
                            const std::string& arguments) {
    const std::string label = "#" + std::to_string(++m_calls);
    if (begins(method, "com."))
        send(controlName, controlPath, method, arguments, label);
    else if (begins(method, "org."))
        send("org.freedesktop.DBus", "/org/freedesktop/DBus", method, arguments, label);
    else
        send(daemonName, path, "org.bluez." + method, arguments, label);
    std::unique_lock<std::mutex> lock(m_mutex);
    if (!m_changed.wait_for(lock, patience, [&] { return m_answers.count(label) != 0; }))
        return "no answer to " + method;
    return m_answers[label];
}

std::string SimClient::control(const std::string& method, const std::string& arguments) {
    std::string answer = call("", std::string(controlName) + "." + method, arguments);
    EXPECT_TRUE(begins(answer, "reply")) << method << arguments << ": " << answer;
    return answer;
}

void SimClient::awaitEnd(const std::string& otherName) {
    while (call("", "org.freedesktop.DBus.NameHasOwner", "('" + otherName + "',)") ==
           "reply true") {
    }
    control("ClearFaults");
}

void SimClient::agentAnswers(const std::string& method, const std::string& answer) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_agent[method] = answer;
}

Lines SimClient::until(const std::string& beginning) {
    std::unique_lock<std::mutex> lock(m_mutex);
    const auto find = [&] {
        return std::find_if(m_lines.begin(), m_lines.end(),
                            [&](const std::string& line) { return begins(line, beginning); });
    };
    m_changed.wait_for(lock, patience, [&] { return find() != m_lines.end(); });
    auto end = find();
    if (end == m_lines.end())
        ADD_FAILURE() << "never came: " << beginning;
    else
        ++end;
    Lines lines(m_lines.begin(), end);
    m_lines.erase(m_lines.begin(), end);
    return lines;
}

Lines SimClient::taken() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return std::exchange(m_lines, {});
}

std::string SimClient::base() {
    send(daemonName, "/", "org.bluez.Manager.FindAdapter", "('any',)", "*base");
    std::unique_lock<std::mutex> lock(m_mutex);
    m_changed.wait_for(lock, patience, [&] { return m_answers.count("*base") != 0; });
    const std::string path = m_answers["*base"];
    m_answers.erase("*base");
    return path.substr(0, path.rfind('/') + 1);
}

void SimClient::add(const std::string& line) {
    m_lines.push_back(line);
    m_changed.notify_all();
}

GDBusMessage* SimClient::onMessage(GDBusConnection*, GDBusMessage* message, gboolean incoming,
                                   gpointer data) {
    if (!incoming)
        return message;
    auto* client = static_cast<SimClient*>(data);
    const auto type = g_dbus_message_get_message_type(message);
    const std::lock_guard<std::mutex> lock(client->m_mutex);
    if (type == G_DBUS_MESSAGE_TYPE_METHOD_CALL) {
        client->add("agent " + std::string(g_dbus_message_get_member(message)) +
                    printBody(message));
        client->answerAgentCall(message);
        g_object_unref(message);
        return nullptr;
    }
    const std::string line = client->describe(message);
    if (!line.empty())
        client->add(line);
    return message;
}

std::string SimClient::describe(GDBusMessage* message) {
    const auto type = g_dbus_message_get_message_type(message);
    if (type == G_DBUS_MESSAGE_TYPE_SIGNAL) {
        const std::string path = last(g_dbus_message_get_path(message));
        const std::string member = g_dbus_message_get_member(message);
        if (path == "DBus") // the bus's own
            return "";
        GVariant* body = g_dbus_message_get_body(message);
        if (member != "PropertyChanged" || !g_variant_is_of_type(body, G_VARIANT_TYPE("(sv)")))
            return path + " " + member + printBody(message);
        const char* name = nullptr;
        GVariant* value = nullptr;
        g_variant_get(body, "(&sv)", &name, &value);
        std::string line = path + " " + name + "=" + print(value);
        g_variant_unref(value);
        return line;
    }
    const auto label = m_labels.find(g_dbus_message_get_reply_serial(message));
    if (label == m_labels.end())
        return "";
    const std::string name = label->second;
    std::string answer = printBody(message);
    if (name == "*base") {
        const char* path = nullptr;
        g_variant_get(g_dbus_message_get_body(message), "(&o)", &path);
        answer = path;
    }
    m_labels.erase(label);
    const bool failed = type == G_DBUS_MESSAGE_TYPE_ERROR;
    if (failed) {
        const char* text = nullptr;
        g_variant_get(g_dbus_message_get_body(message), "(&s)", &text);
        answer = " " + std::string(g_dbus_message_get_error_name(message)) + ": " + text;
    }
    if (name[0] != '#' && name[0] != '*')
        return (failed ? "error " : "reply ") + name + answer;
    m_answers[name] = name[0] == '*' ? answer : (failed ? "error" : "reply") + answer;
    m_changed.notify_all();
    return "";
}

void SimClient::answerAgentCall(GDBusMessage* call) {
    const auto found = m_agent.find(g_dbus_message_get_member(call));
    const std::string answer = found == m_agent.end() ? "" : found->second;
    if (answer == "-")
        return;
    GDBusMessage* reply = nullptr;
    if (answer[0] == '!') {
        reply = g_dbus_message_new_method_error_literal(call, answer.c_str() + 1, "said no");
    } else {
        reply = g_dbus_message_new_method_reply(call);
        if (!answer.empty()) {
            GVariant* body = g_variant_parse(nullptr, answer.c_str(), nullptr, nullptr, nullptr);
            g_dbus_message_set_body(reply, body);
            g_variant_unref(body);
        }
    }
    g_dbus_connection_send_message(m_connection, reply, G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr,
                                   nullptr);
    g_object_unref(reply);
}

} // namespace Bluetooth::Test
