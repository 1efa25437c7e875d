// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/agent.h>

#include <bluetooth/connection.h>

#include "core/log.h"

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <thread>

namespace Bluetooth {

namespace {

constexpr const char* agentInterface = "org.bluez.Agent";

/// What an answer carries.
enum class Answered { None, PinCode, Passkey };

/// What the daemon may ask, and where the handlers differ.
struct Request {
    const char* method;
    const char* name; ///< in log lines
    int arguments[2]; ///< D-Bus types
    Answered value;
    bool obeysReject; ///< not for PIN codes: a program may reject and still let old devices pair
    bool isDelayed;
    bool needsReply;                ///< false: the delay is taken even when no reply could be made
    DBusHandlerResult badArguments; ///< a bad RequestPinCode is not offered to other handlers
};

constexpr auto handled = DBUS_HANDLER_RESULT_HANDLED;
constexpr auto notYetHandled = DBUS_HANDLER_RESULT_NOT_YET_HANDLED;
constexpr int path = DBUS_TYPE_OBJECT_PATH;
constexpr int number = DBUS_TYPE_UINT32;
constexpr int text = DBUS_TYPE_STRING;

/// The rows of `requests`.
enum { pinCodeRow, passkeyRow, confirmationRow, authorizeRow, cancelRow, releaseRow };

// clang-format off
constexpr Request requests[] = {
    // method              name                    arguments       value           reject delay  reply  bad arguments
    {"RequestPinCode",      "request pin code",     {path},         Answered::PinCode, false, true,  true,  handled},
    {"RequestPasskey",      "request passkey",      {path},         Answered::Passkey, true,  true,  false, notYetHandled},
    {"RequestConfirmation", "request confirmation", {path, number}, Answered::None,    true,  true,  true,  notYetHandled},
    {"Authorize",           "authorize",            {path, text},   Answered::None,    true,  false, true,  notYetHandled},
    {"Cancel",              "cancel",               {},             Answered::None,    false, false, true,  notYetHandled},
    {"Release",             "release",              {},             Answered::None,    false, false, true,  notYetHandled},
};
// clang-format on

bool readArguments(DBusMessage* message, const Request& request) {
    DBusBasicValue first;
    DBusBasicValue second;
    // A type of DBUS_TYPE_INVALID ends the list.
    return message && dbus_message_get_args(message, nullptr, request.arguments[0], &first,
                                            request.arguments[1], &second, DBUS_TYPE_INVALID);
}

DBusMessage* makeReply(DBusMessage* message, bool rejected) {
    // A message that was never sent has no serial to reply to; libdbus would abort.
    if (dbus_message_get_serial(message) == 0)
        return nullptr;
    return rejected ? dbus_message_new_error(message, "org.bluez.Error.Rejected", "")
                    : dbus_message_new_method_return(message);
}

/// Without a reply nothing is appended, which is no failure of its own.
bool appendValue(DBusMessage* reply, Answered value, const char* passkey) {
    if (!reply || value == Answered::None)
        return true;
    if (value == Answered::PinCode)
        return dbus_validate_utf8(passkey, nullptr) &&
               dbus_message_append_args(reply, DBUS_TYPE_STRING, &passkey, DBUS_TYPE_INVALID);
    const auto asNumber = static_cast<dbus_uint32_t>(std::strtoul(passkey, nullptr, 10));
    return dbus_message_append_args(reply, DBUS_TYPE_UINT32, &asNumber, DBUS_TYPE_INVALID);
}

DBusHandlerResult answer(DBusConnection* connection, DBusMessage* message, const void* data,
                         const Request& request) {
    const auto* agent = static_cast<const Agent*>(data);
    if (!agent || !readArguments(message, request)) {
        logError(KES_HERE, "Failed to get argument from %s message.", request.name);
        return request.badArguments;
    }
    const bool rejected = request.obeysReject && agent->getReject();
    DBusMessage* reply = makeReply(message, rejected);
    if (!reply) {
        logError(KES_HERE, "Failed to create reply message when handling %s message.",
                 request.name);
        if (request.needsReply)
            return DBUS_HANDLER_RESULT_NEED_MEMORY;
    }
    if (request.isDelayed && !rejected)
        std::this_thread::sleep_for(std::chrono::seconds(agent->getPasskeyDelay()));
    if (!rejected && !appendValue(reply, request.value, agent->getPasskeyValue()))
        logError(KES_HERE, "Failed to append the passkey value when handling %s message.",
                 request.name);
    if (reply && connection)
        dbus_connection_send(connection, reply, nullptr);
    if (connection)
        dbus_connection_flush(connection);
    if (!reply)
        return DBUS_HANDLER_RESULT_NEED_MEMORY;
    dbus_message_unref(reply);
    return handled;
}

} // namespace

const char* const Agent::PSZ_NO_INPUT_NO_OUTPUT = "NoInputNoOutput";
const char* const Agent::PSZ_KEYBOARD_ONLY = "KeyboardOnly";
const char* const Agent::PSZ_DISPLAY_YES_NO = "DisplayYesNo";
const char* const Agent::PSZ_DISPLAY_ONLY = "DisplayOnly";

Agent::Agent()
    : m_handlers(std::make_unique<DBusObjectPathVTable>()),
      m_passkeyValue("5820"),
      m_capability(PSZ_DISPLAY_YES_NO) {
    m_handlers->message_function = handlerDispatcher;
}

Agent::~Agent() = default;

int Agent::registerPath() {
    m_path = "/org/bluez/agent_" + std::to_string(getpid());
    // The connection's reference is kept: it is the process's own as long as it runs.
    DBusConnection* connection = Connection::get(DBUS_BUS_SYSTEM);
    if (connection && dbus_connection_try_register_object_path(connection, m_path.c_str(),
                                                               m_handlers.get(), this, nullptr))
        return 0;
    logError(KES_HERE, "Failed to register agent path to dbus.");
    return -1;
}

int Agent::unregisterPath() {
    DBusConnection* connection = m_path.empty() ? nullptr : Connection::get(DBUS_BUS_SYSTEM);
    // libdbus would abort on a path that nobody has registered. All agents of a process share one:
    // whichever is registered there goes.
    void* owner = nullptr;
    if (connection && dbus_connection_get_object_path_data(connection, m_path.c_str(), &owner) &&
        owner && dbus_connection_unregister_object_path(connection, m_path.c_str()))
        return 0;
    logError(KES_HERE, "Failed to unregister agent path from dbus.");
    return -1;
}

const char* Agent::getInterface() const {
    return agentInterface;
}

int Agent::setPasskeyValue(const char* value) {
    if (!value) {
        logError(KES_HERE, "Failed to set null passkey value.");
        return -1;
    }
    m_passkeyValue = value;
    return 0;
}

int Agent::setPasskeyDelay(int seconds) {
    if (seconds < 0) {
        logError(KES_HERE, "Failed to set negitive passkey delay."); // sic: programs match it
        return -1;
    }
    m_passkeyDelay = seconds;
    return 0;
}

int Agent::setDispatcher(DBusObjectPathMessageFunction dispatcher) {
    if (!dispatcher)
        return -1;
    m_handlers->message_function = dispatcher;
    return 0;
}

int Agent::setCapability(const char* capability) {
    if (!capability)
        return -1;
    m_capability = capability;
    return 0;
}

DBusHandlerResult Agent::handlerDispatcher(DBusConnection* connection, DBusMessage* message,
                                           void* agent) {
    for (const Request& request : requests) {
        if (message && dbus_message_is_method_call(message, agentInterface, request.method))
            return answer(connection, message, agent, request);
    }
    logError(KES_HERE, "Registered agent does not provide a handler for the incoming message.");
    return notYetHandled;
}

void Agent::handlerUnregisterDispatcher(DBusConnection* /*connection*/, void* /*agent*/) {}

DBusHandlerResult Agent::requestPinCode(DBusConnection* connection, DBusMessage* message,
                                        void* agent) {
    return answer(connection, message, agent, requests[pinCodeRow]);
}

DBusHandlerResult Agent::requestPasskey(DBusConnection* connection, DBusMessage* message,
                                        void* agent) {
    return answer(connection, message, agent, requests[passkeyRow]);
}

DBusHandlerResult Agent::requestConfirmation(DBusConnection* connection, DBusMessage* message,
                                             void* agent) {
    return answer(connection, message, agent, requests[confirmationRow]);
}

DBusHandlerResult Agent::authorize(DBusConnection* connection, DBusMessage* message, void* agent) {
    return answer(connection, message, agent, requests[authorizeRow]);
}

DBusHandlerResult Agent::cancel(DBusConnection* connection, DBusMessage* message, void* agent) {
    return answer(connection, message, agent, requests[cancelRow]);
}

DBusHandlerResult Agent::release(DBusConnection* connection, DBusMessage* message, void* agent) {
    return answer(connection, message, agent, requests[releaseRow]);
}

DBusHandlerResult Agent::displayPasskey(DBusConnection* /*connection*/, DBusMessage* /*message*/,
                                        void* /*agent*/) {
    return notYetHandled;
}

DBusHandlerResult Agent::confirmModeChange(DBusConnection* /*connection*/, DBusMessage* /*message*/,
                                           void* /*agent*/) {
    return handled;
}

} // namespace Bluetooth
