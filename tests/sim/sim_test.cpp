#include "sim/sim_test.h"

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <regex>

namespace Bluetooth::Test {

namespace {

bool begins(const std::string& text, const std::string& beginning) {
    return text.compare(0, beginning.size(), beginning) == 0;
}

Serving::Value parse(const std::string& arguments) {
    GVariant* value = g_variant_parse(nullptr, arguments.c_str(), nullptr, nullptr, nullptr);
    EXPECT_NE(value, nullptr) << arguments;
    return value;
}

} // namespace

SimClient::SimClient() {
    Serving::ErrorOut error;
    constexpr auto flags =
        static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                          G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
    m_connection = g_dbus_connection_new_for_address_sync(std::getenv("DBUS_SYSTEM_BUS_ADDRESS"),
                                                          flags, nullptr, nullptr, error.out());
    if (!m_connection)
        throw std::runtime_error(error->message);
    m_filter = g_dbus_connection_add_filter(m_connection, onMessage, this, nullptr);
    call("org.freedesktop.DBus.AddMatch", "(\"type='signal',sender='org.bluez'\",)");
}

SimClient::~SimClient() {
    g_dbus_connection_close_sync(m_connection, nullptr, nullptr);
    g_dbus_connection_remove_filter(m_connection, m_filter);
    g_object_unref(m_connection);
}

SimClient::Message SimClient::makeCall(const std::string& method, const std::string& arguments,
                                       const std::string& path) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    const std::size_t dot = method.rfind('.');
    std::string interface = method.substr(0, dot);
    std::string destination = interface;
    std::string usual = "/" + std::regex_replace(interface, std::regex("\\."), "/");
    if (!begins(interface, "com.") && !begins(interface, "org.")) {
        const std::string adapter = m_base + "hci0";
        usual = interface == "Adapter" ? adapter : adapter + "/dev_00_11_22_33_44_55";
        if (interface == "Manager")
            usual = "/";
        destination = "org.bluez";
        interface = "org.bluez." + interface;
    }
    Message message(g_dbus_message_new_method_call(destination.c_str(),
                                                   (path.empty() ? usual : path).c_str(),
                                                   interface.c_str(), method.c_str() + dot + 1));
    g_dbus_message_set_body(message.get(), parse(arguments).get());
    return message;
}

void SimClient::start(const std::string& label, const std::string& method,
                      const std::string& arguments) {
    const Message message = makeCall(method, arguments, "");
    const std::lock_guard<std::mutex> lock(m_mutex);
    guint32 serial = 0;
    g_dbus_connection_send_message(m_connection, message.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                   &serial, nullptr);
    m_labels[serial] = label;
}

std::string SimClient::call(const std::string& method, const std::string& arguments,
                            const std::string& path) {
    const Message reply(g_dbus_connection_send_message_with_reply_sync(
        m_connection, makeCall(method, arguments, path).get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE,
        static_cast<gint>(patience.count()), nullptr, nullptr, nullptr));
    const std::lock_guard<std::mutex> lock(m_mutex);
    return reply ? answer(reply.get(), "") : "no answer to " + method;
}

std::string SimClient::control(const std::string& method, const std::string& arguments) {
    std::string reply = call("com.kestrine.bluetooth.Sim." + method, arguments);
    EXPECT_TRUE(begins(reply, "reply")) << method << arguments << ": " << reply;
    return reply;
}

Texts SimClient::trace(const std::string& method, const std::string& arguments,
                       const std::string& last) {
    taken();
    start("call", method, arguments);
    return until(last);
}

void SimClient::agentAnswers(const std::string& method, const std::string& answer) {
    const std::lock_guard<std::mutex> lock(m_mutex);
    m_agent[method] = answer;
}

Texts SimClient::until(const std::string& beginning) {
    std::unique_lock<std::mutex> lock(m_mutex);
    const auto isLast = [&](const std::string& line) {
        return beginning.empty() ? begins(line, "reply call") || begins(line, "error call")
                                 : begins(line, beginning);
    };
    auto last = m_lines.end();
    m_changed.wait_for(lock, patience, [&] {
        last = std::find_if(m_lines.begin(), m_lines.end(), isLast);
        return last != m_lines.end();
    });
    EXPECT_NE(last, m_lines.end()) << "never came: " << beginning;
    const auto end = last == m_lines.end() ? last : std::next(last);
    Texts lines(m_lines.begin(), end);
    m_lines.erase(m_lines.begin(), end);
    return lines;
}

Texts SimClient::taken() {
    const std::lock_guard<std::mutex> lock(m_mutex);
    return std::exchange(m_lines, {});
}

std::string SimClient::base() {
    call("Manager.FindAdapter", "('any',)");
    return m_base;
}

std::string SimClient::shorten(std::string text) {
    static const std::regex base("/org/bluez/[0-9]+/");
    static const std::regex types("objectpath |@a[osv] |u?int(16|32) |byte ");
    static const std::regex path("'?(hci0/)?dev_00_11_22_33_44_55'?");
    static const std::regex errors("org\\.bluez\\.Error\\.");
    std::smatch found;
    if (std::regex_search(text, found, base))
        m_base = found[0];
    for (const std::regex& noise : {base, types, errors})
        text = std::regex_replace(text, noise, "");
    return std::regex_replace(text, path, "phone");
}

/// The arguments, each after a space.
std::string SimClient::bodyOf(GDBusMessage* message) {
    GVariant* body = g_dbus_message_get_body(message);
    std::string text;
    for (gsize i = 0; body && i < g_variant_n_children(body); ++i)
        text += " " + print(Serving::GlibPtr<GVariant>(g_variant_get_child_value(body, i)).get());
    return text;
}

std::string SimClient::print(GVariant* value) {
    return shorten(Serving::GlibPtr<char>(g_variant_print(value, FALSE)).get());
}

std::string SimClient::answer(GDBusMessage* message, const std::string& label) {
    if (g_dbus_message_get_message_type(message) != G_DBUS_MESSAGE_TYPE_ERROR)
        return "reply" + label + bodyOf(message);
    const char* text = nullptr;
    g_variant_get(g_dbus_message_get_body(message), "(&s)", &text);
    return "error" + label + " " + shorten(g_dbus_message_get_error_name(message)) + ": " + text;
}

std::string SimClient::signalLine(GDBusMessage* message) {
    const std::string path = g_dbus_message_get_path(message);
    if (begins(path, DBUS_PATH_DBUS)) // the bus's own
        return "";
    const std::string sender = path == "/" ? path : shorten(path.substr(path.rfind('/') + 1));
    const std::string member = g_dbus_message_get_member(message);
    GVariant* body = g_dbus_message_get_body(message);
    if (member != "PropertyChanged" || !g_variant_is_of_type(body, G_VARIANT_TYPE("(sv)")))
        return sender + " " + member + bodyOf(message);
    const char* name = nullptr;
    GVariant* value = nullptr;
    g_variant_get(body, "(&sv)", &name, &value);
    return sender + " " + name + "=" + print(Serving::GlibPtr<GVariant>(value).get());
}

GDBusMessage* SimClient::onMessage(GDBusConnection*, GDBusMessage* message, gboolean incoming,
                                   gpointer data) {
    if (!incoming)
        return message;
    auto* client = static_cast<SimClient*>(data);
    const auto type = g_dbus_message_get_message_type(message);
    const std::lock_guard<std::mutex> lock(client->m_mutex);
    std::string line;
    if (type == G_DBUS_MESSAGE_TYPE_METHOD_CALL) {
        line = "agent " + std::string(g_dbus_message_get_member(message)) + client->bodyOf(message);
    } else if (type == G_DBUS_MESSAGE_TYPE_SIGNAL) {
        line = client->signalLine(message);
    } else {
        const auto label = client->m_labels.find(g_dbus_message_get_reply_serial(message));
        if (label != client->m_labels.end())
            line = client->answer(message, " " + label->second);
    }
    if (!line.empty()) {
        client->m_lines.push_back(line);
        client->m_changed.notify_all();
    }
    if (type != G_DBUS_MESSAGE_TYPE_METHOD_CALL)
        return message;
    client->answerAgentCall(message);
    g_object_unref(message);
    return nullptr;
}

void SimClient::answerAgentCall(GDBusMessage* call) {
    const std::string answer = m_agent[g_dbus_message_get_member(call)];
    if (answer == "-")
        return;
    const Message reply(begins(answer, "!") ? g_dbus_message_new_method_error_literal(
                                                  call, answer.c_str() + 1, "said no")
                                            : g_dbus_message_new_method_reply(call));
    if (!answer.empty() && answer[0] != '!')
        g_dbus_message_set_body(reply.get(), parse(answer).get());
    g_dbus_connection_send_message(m_connection, reply.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                   nullptr, nullptr);
}

void SimTest::TearDown() {
    client.reset();
    if (daemon.hasEnded())
        return;
    daemon.signal(SIGTERM);
    EXPECT_EQ(daemon.wait(), 0);
    daemon.readAll();
    EXPECT_EQ(daemon.readErrors(), "");
}

void SimTest::add(const std::string& settings, const std::string& address) {
    client->control("AddDevice", "('" + address + "', @a{sv} {" + settings + "})");
}

void SimTest::create(const std::string& settings) {
    add(settings);
    EXPECT_EQ(client->call("Adapter.CreateDevice", byAddress), "reply phone");
    client->taken();
}

Texts SimTest::set(const std::string& name, const std::string& value,
                   const std::string& interface) {
    client->taken();
    client->start("set", interface + ".SetProperty", "('" + name + "', <" + value + ">)");
    client->control("ClearFaults"); // answered after all that the call brought about
    return client->taken();
}

void SimTest::leave(std::unique_ptr<SimClient>& other) {
    const std::string name = other->uniqueName();
    other.reset();
    while (client->call("org.freedesktop.DBus.NameHasOwner", "('" + name + "',)") == "reply true") {
    }
    client->control("ClearFaults");
}

} // namespace Bluetooth::Test
