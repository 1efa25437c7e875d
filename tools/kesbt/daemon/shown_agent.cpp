// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/shown_agent.h"

#include "daemon/refusal.h"
#include "show/decode.h"
#include "show/text.h"
#include "show/uuid.h"

#include <bluetooth/commandlib.h>

#include <cstdlib>
#include <vector>

namespace Kesbt {

namespace {

std::vector<std::string> capabilities() {
    using Bluetooth::Agent;
    return {Agent::PSZ_DISPLAY_YES_NO, Agent::PSZ_DISPLAY_ONLY, Agent::PSZ_KEYBOARD_ONLY,
            Agent::PSZ_NO_INPUT_NO_OUTPUT};
}

std::string checkCapability(const std::string& text) {
    std::string all;
    for (const std::string& known : capabilities()) {
        if (text == known)
            return "";
        all.append(all.empty() ? "" : ", ").append(known);
    }
    return quoted(text) + " is none of " + all;
}

std::string checkPin(const std::string& text) {
    constexpr std::size_t longest = 16;
    return !text.empty() && text.size() <= longest ? "" : "a PIN has 1 to 16 characters";
}

bool isDisplay(const std::string& method) {
    return method == "DisplayPasskey" || method == "DisplayPinCode";
}

std::string describeDetail(const std::string& method, const Json& detail) {
    const bool isPasskey = method == "RequestConfirmation" || method == "DisplayPasskey";
    std::string text = display(detail);
    if (isPasskey && detail.is_number() && text.size() < 6)
        text.insert(0, 6 - text.size(), '0');
    return text;
}

DBusHandlerResult replyEmpty(DBusConnection* connection, DBusMessage* message) {
    if (dbus_message_get_no_reply(message))
        return DBUS_HANDLER_RESULT_HANDLED;
    DBusMessage* reply = dbus_message_new_method_return(message);
    if (!reply)
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    dbus_connection_send(connection, reply, nullptr);
    dbus_message_unref(reply);
    return DBUS_HANDLER_RESULT_HANDLED;
}

} // namespace

std::shared_ptr<AgentSettings> addAgentOptions(const Syntax& syntax) {
    auto settings = std::make_shared<AgentSettings>();
    syntax.app
        .add_option("--pin", settings->pin,
                    "The answer to a request for a PIN code or a\npasskey (default: 5820)")
        ->type_name("TEXT")
        ->check(checkPin);
    const CLI::Option* capability =
        syntax.app
            .add_option("--capability", settings->capability,
                        "What this side can do: DisplayYesNo (default),\nDisplayOnly, KeyboardOnly "
                        "or NoInputNoOutput")
            ->type_name("NAME")
            ->check(checkCapability);
    syntax.completion.offer(capability, [](const auto&) { return capabilities(); });
    syntax.app.add_option("--delay", settings->delay, "Wait so long before each answer")
        ->type_name("SECONDS")
        ->check([](const std::string& text) {
            constexpr std::size_t longest = 4;
            const bool isNumber = !text.empty() && text.size() <= longest &&
                                  text.find_first_not_of("0123456789") == std::string::npos;
            return isNumber ? std::string() : quoted(text) + " is no number from 0 to 9999";
        });
    syntax.app.add_flag("--reject", settings->reject,
                        "Refuse passkeys, confirmations and services (a PIN\ncode is given all the "
                        "same)");
    return settings;
}

std::string AgentRequest::text() const {
    const std::string subject = address.empty() ? "bluetoothd" : address;
    if (method == "RequestPinCode")
        return subject + " asks for a PIN code: " + answer;
    if (method == "RequestPasskey")
        return subject + " asks for a passkey: " + answer;
    if (method == "RequestConfirmation")
        return subject + " asks to confirm the passkey " + detail + ": " + answer;
    if (isDisplay(method))
        return "Type " + detail + " on " + subject;
    if (method == "Authorize") {
        const std::string name = uuidName(detail);
        return subject + " asks to use the service " + (name.empty() ? detail : name) + ": " +
               answer;
    }
    if (method == "Cancel")
        return "bluetoothd has cancelled its last request";
    if (method == "Release")
        return "bluetoothd has released the agent";
    return subject + " asks " + method + ": " + answer;
}

ShownAgent::ShownAgent(const AgentSettings& settings, Show show)
    : m_capability(settings.capability), m_show(std::move(show)) {
    setPasskeyValue(settings.pin.c_str());
    setPasskeyDelay(settings.delay);
    setReject(settings.reject);
    setCapability(m_capability.c_str());
    setDispatcher(dispatch);
    if (registerPath() != 0)
        throw daemonAbsent();
}

ShownAgent::~ShownAgent() {
    unregisterPath();
}

DBusHandlerResult ShownAgent::dispatch(DBusConnection* connection, DBusMessage* message,
                                       void* agent) {
    return static_cast<ShownAgent*>(static_cast<Agent*>(agent))->handle(connection, message);
}

DBusHandlerResult ShownAgent::handle(DBusConnection* connection, DBusMessage* message) {
    AgentRequest request;
    const char* member = dbus_message_get_member(message);
    request.method = member ? member : "";
    const Json arguments = decodeArguments(message);
    if (!arguments.empty() && arguments[0].is_string()) {
        const std::unique_ptr<char, decltype(&std::free)> address(
            Bluetooth::getAddressFromPath(arguments[0].get<std::string>().c_str()), std::free);
        request.address = address ? address.get() : "";
    }
    if (arguments.size() > 1)
        request.detail = describeDetail(request.method, arguments[1]);

    const DBusHandlerResult result = isDisplay(request.method)
                                         ? replyEmpty(connection, message)
                                         : handlerDispatcher(connection, message, this);
    m_released = m_released || request.method == "Release";
    request.answer = answerTo(request.method, result);
    m_show(request);
    return result;
}

std::string ShownAgent::answerTo(const std::string& method, DBusHandlerResult result) const {
    if (result != DBUS_HANDLER_RESULT_HANDLED)
        return "not answered";
    if (method == "RequestPinCode")
        return getPasskeyValue(); // whether or not the agent rejects
    if (method == "Cancel" || method == "Release")
        return "acknowledged";
    if (isDisplay(method))
        return "shown";
    if (getReject())
        return "rejected";
    if (method == "RequestPasskey")
        return std::to_string(std::strtoul(getPasskeyValue(), nullptr, 10));
    return "accepted";
}

} // namespace Kesbt
