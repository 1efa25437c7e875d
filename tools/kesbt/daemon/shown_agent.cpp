// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/shown_agent.h"

#include "daemon/refusal.h"
#include "show/decode.h"
#include "show/output.h"
#include "show/text.h"
#include "show/uuid.h"

#include <bluetooth/commandlib.h>
#include <bluetooth/device.h>

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <utility>
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
    const bool isPin =
        !text.empty() && text.size() <= longest && dbus_validate_utf8(text.c_str(), nullptr) != 0;
    return isPin ? "" : "a PIN has 1 to 16 characters";
}

std::string checkPasskey(const std::string& text) {
    constexpr std::size_t longest = 6;
    const bool isPasskey = !text.empty() && text.size() <= longest &&
                           text.find_first_not_of("0123456789") == std::string::npos;
    return isPasskey ? "" : "a passkey has 1 to 6 digits";
}

/// Anything else than a clear yes is a no.
std::string checkNothing(const std::string& /*text*/) {
    return "";
}

bool isYes(const std::string& line) {
    const std::string word = upperCase(line);
    return word == "Y" || word == "YES";
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

/// Sends the answer to a request: an error, or a return that carries a value or, without a type,
/// none.
DBusHandlerResult reply(DBusConnection* connection, DBusMessage* request, bool isRejected = false,
                        int type = DBUS_TYPE_INVALID, const void* value = nullptr) {
    if (dbus_message_get_no_reply(request) != 0)
        return DBUS_HANDLER_RESULT_HANDLED;
    DBusMessage* message = isRejected ? dbus_message_new_error(request, "org.bluez.Error.Rejected",
                                                               "Refused by the user")
                                      : dbus_message_new_method_return(request);
    if (!message)
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    if (type != DBUS_TYPE_INVALID)
        dbus_message_append_args(message, type, value, DBUS_TYPE_INVALID);
    dbus_connection_send(connection, message, nullptr);
    dbus_connection_flush(connection); // another thread may be at the socket
    dbus_message_unref(message);
    return DBUS_HANDLER_RESULT_HANDLED;
}

std::string serviceName(const std::string& uuid) {
    const std::string name = uuidName(uuid);
    return name.empty() ? uuid : name;
}

/// What people call the device: its address, and its name where the daemon tells one at once.
std::string deviceName(const AgentRequest& request) {
    if (request.address.empty())
        return "an unknown device";
    constexpr int longestMs = 1000;
    Bluetooth::Device device(request.path.c_str());
    Bluetooth::Dict properties;
    const bool isKnown = device.newMessage("GetProperties") == 0 &&
                         device.sendMessage(true, longestMs) == 0 &&
                         device.getReplyValue(properties) == 0;
    const std::string name = isKnown ? field(toJson(properties), "Alias") : "";
    return request.address + (name.empty() ? "" : " " + quoted(name));
}

/// What one who can see a device's display or its buttons is asked.
std::string questionText(const AgentRequest& request) {
    const std::string device = deviceName(request);
    if (request.method == "RequestPinCode")
        return "PIN code for " + device + " (empty refuses): ";
    if (request.method == "RequestPasskey")
        return "Passkey that " + device + " shows (empty refuses): ";
    if (request.method == "RequestConfirmation")
        return "Pair with " + device + ", which has to show the passkey " + request.detail +
               "? [y/N] ";
    return "Let " + device + " use the service " + printable(serviceName(request.detail)) +
           "? [y/N] ";
}

} // namespace

std::shared_ptr<AgentSettings> addAgentOptions(const Syntax& syntax) {
    auto settings = std::make_shared<AgentSettings>();
    CLI::Option* accept = syntax.app.add_flag(
        "--yes", settings->accept, "Accept passkeys and services without asking anybody");
    syntax.app
        .add_option_function<std::string>(
            "--pin", [settings](const std::string& pin) { settings->pin = pin; },
            "The answer to a request for a PIN code or a passkey, without asking anybody")
        ->type_name("TEXT")
        ->check(checkPin);
    syntax.app
        .add_flag("--reject", settings->reject,
                  "Refuse passkeys and services, and PIN codes too unless --pin is given")
        ->excludes(accept);
    const CLI::Option* capability =
        syntax.app
            .add_option("--capability", settings->capability,
                        "What this side can do: DisplayYesNo (default), DisplayOnly, KeyboardOnly "
                        "or NoInputNoOutput")
            ->type_name("NAME")
            ->check(checkCapability);
    syntax.completion.offer(capability, [](const auto&) { return capabilities(); });
    syntax.app
        .add_option("--delay", settings->delay,
                    "Wait so long before each answer that nobody is asked for")
        ->type_name("SECONDS")
        ->check([](const std::string& text) {
            constexpr std::size_t longest = 4;
            const bool isNumber = !text.empty() && text.size() <= longest &&
                                  text.find_first_not_of("0123456789") == std::string::npos;
            return isNumber ? std::string() : quoted(text) + " is no number from 0 to 9999";
        });
    return settings;
}

std::string nobodyToAsk(const std::string& options) {
    return "there is no terminal to ask at; answer with " + options;
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
    if (method == "Authorize")
        return subject + " asks to use the service " + serviceName(detail) + ": " + answer;
    if (method == "Cancel")
        return "bluetoothd has cancelled its last request";
    if (method == "Release")
        return "bluetoothd has released the agent";
    return subject + " asks " + method + ": " + answer;
}

/// What is asked with a method.
struct ShownAgent::Kind {
    enum class Value { None, PinCode, Passkey };

    const char* method;
    const char* signature;
    Value value; ///< what the answer carries
    std::string (*check)(const std::string& line);
    const char* options; ///< which answer it where nobody can be asked
};

struct ShownAgent::Answer {
    bool isGiven = false;
    std::string value = {};
};

/// A request that was not answered yet.
struct ShownAgent::Pending {
    struct Unref {
        void operator()(DBusMessage* message) const { dbus_message_unref(message); }
    };

    const Kind& kind;
    DBusConnection* connection; // the process's own, which stays
    // A copy: the library takes a thread that keeps the request itself to be inside its dispatch.
    std::unique_ptr<DBusMessage, Unref> message;
    AgentRequest request;
};

const ShownAgent::Kind* ShownAgent::kindOf(DBusMessage* message) {
    static constexpr Kind kinds[] = {
        {"RequestPinCode", "o", Kind::Value::PinCode, checkPin, "--pin TEXT"},
        {"RequestPasskey", "o", Kind::Value::Passkey, checkPasskey, "--pin PASSKEY"},
        {"RequestConfirmation", "ou", Kind::Value::None, checkNothing, "--yes"},
        {"Authorize", "os", Kind::Value::None, checkNothing, "--yes"},
    };
    const auto* const found =
        std::find_if(std::begin(kinds), std::end(kinds), [message](const Kind& kind) {
            return dbus_message_is_method_call(message, "org.bluez.Agent", kind.method) != 0 &&
                   dbus_message_has_signature(message, kind.signature) != 0;
        });
    return found == std::end(kinds) ? nullptr : found;
}

ShownAgent::ShownAgent(const AgentSettings& settings, Show show)
    : m_settings(settings), m_show(std::move(show)) {
    setCapability(m_settings.capability.c_str());
    setDispatcher(dispatch);
    if (registerPath() != 0)
        throw daemonAbsent();
}

ShownAgent::~ShownAgent() {
    m_questions.end();
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
        request.path = arguments[0].get<std::string>();
        const std::unique_ptr<char, decltype(&std::free)> address(
            Bluetooth::getAddressFromPath(request.path.c_str()), std::free);
        request.address = address ? address.get() : "";
    }
    if (arguments.size() > 1)
        request.detail = describeDetail(request.method, arguments[1]);

    const Kind* kind = kindOf(message);
    if (!kind)
        return tell(std::move(request), connection, message);
    const auto pending =
        std::make_shared<Pending>(Pending{*kind, connection, {}, std::move(request)});
    pending->message.reset(dbus_message_copy(message));
    if (!pending->message)
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    dbus_message_set_serial(pending->message.get(), dbus_message_get_serial(message));
    decide(pending);
    return DBUS_HANDLER_RESULT_HANDLED;
}

/// What needs no decision.
DBusHandlerResult ShownAgent::tell(AgentRequest request, DBusConnection* connection,
                                   DBusMessage* message) {
    const bool isShown = isDisplay(request.method);
    const DBusHandlerResult result =
        isShown ? reply(connection, message) : handlerDispatcher(connection, message, this);
    const bool isHandled = result == DBUS_HANDLER_RESULT_HANDLED;
    const bool isReleased = request.method == "Release";
    if (isReleased || request.method == "Cancel")
        m_questions.withdraw();
    m_released = m_released || isReleased;
    request.answer = !isHandled ? "not answered" : isShown ? "shown" : "acknowledged";
    show(request);
    return result;
}

/// Answers as the settings say, at once or after the delay; else somebody is asked.
void ShownAgent::decide(const std::shared_ptr<Pending>& pending) {
    const std::optional<Answer> answer = answerOf(pending->kind);
    Question question;
    question.refuse = [this, pending] { finish(*pending, {}); };
    if (answer) {
        const bool isDelayed = answer->isGiven && m_settings.delay > 0;
        question.due = Clock::now() + std::chrono::seconds(isDelayed ? m_settings.delay : 0);
        question.answer = [this, pending, answer](const std::string&) {
            finish(*pending, *answer);
        };
        if (!isDelayed)
            return question.answer("");
    } else if (Questions::canAsk()) {
        question.text = [pending] { return questionText(pending->request); };
        question.check = pending->kind.check;
        question.answer = [this, pending](const std::string& line) {
            const bool needsYes = pending->kind.value == Kind::Value::None;
            finish(*pending, {!needsYes || isYes(line), line});
        };
        pending->request.wasAsked = true;
    } else {
        pending->request.advice = nobodyToAsk(pending->kind.options);
        return question.refuse();
    }
    const auto refuse = question.refuse;
    if (!m_questions.put(std::move(question)))
        refuse();
}

/// What the settings say; nothing where somebody is to be asked.
std::optional<ShownAgent::Answer> ShownAgent::answerOf(const Kind& kind) const {
    const bool asksValue = kind.value != Kind::Value::None;
    const bool isPinCode = kind.value == Kind::Value::PinCode;
    if (m_settings.reject && !(isPinCode && m_settings.pin)) // given on purpose, for old devices
        return Answer{};
    if (asksValue && m_settings.pin && kind.check(*m_settings.pin).empty())
        return Answer{true, *m_settings.pin};
    return !asksValue && m_settings.accept ? std::optional(Answer{true}) : std::nullopt;
}

/// Tells first: who is told may stop listening once the answer is out.
void ShownAgent::finish(Pending& pending, const Answer& answer) {
    const char* pin = answer.value.c_str();
    const auto passkey = static_cast<dbus_uint32_t>(std::strtoul(pin, nullptr, 10));
    const auto value = answer.isGiven ? pending.kind.value : Kind::Value::None;
    DBusMessage* message = pending.message.get();
    std::string& told = pending.request.answer;
    if (value == Kind::Value::PinCode)
        told = answer.value;
    else if (value == Kind::Value::Passkey)
        told = std::to_string(passkey);
    else
        told = answer.isGiven ? "accepted" : "rejected";
    show(pending.request);
    if (value == Kind::Value::PinCode)
        reply(pending.connection, message, false, DBUS_TYPE_STRING, &pin);
    else if (value == Kind::Value::Passkey)
        reply(pending.connection, message, false, DBUS_TYPE_UINT32, &passkey);
    else
        reply(pending.connection, message, !answer.isGiven);
}

void ShownAgent::show(const AgentRequest& request) {
    const std::lock_guard<std::mutex> lock(m_showing);
    m_show(request);
}

} // namespace Kesbt
