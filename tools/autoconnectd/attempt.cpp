// SPDX-License-Identifier: LGPL-2.1-or-later
#include "attempt.h"

#include "shown_text.h"
#include "wakeup.h"

#include <bluetooth/remote_object.h>

#include <utility>

namespace AutoConnectd {

namespace {

constexpr std::chrono::seconds patience{60}; // a device that hangs is given up after some 40 s
constexpr std::size_t longestText = 200;     // bytes

struct MessageUnref {
    void operator()(DBusMessage* message) const { dbus_message_unref(message); }
};
using MessagePtr = std::unique_ptr<DBusMessage, MessageUnref>;

constexpr const char* successes[] = {"org.bluez.Error.AlreadyConnected",
                                     "org.bluez.Error.InProgress"};
constexpr std::pair<const char*, const char*> advices[] = {
    {"org.bluez.Error.Failed",
     "make sure that it is on, within reach and not in use elsewhere, or pair it again"},
    {"org.bluez.Error.NotSupported", "it has nothing to connect; take it off the list"},
    {DBUS_ERROR_ACCESS_DENIED, "the bus does not allow it to this user, run it as root"},
};

std::string reasonOf(const DBusError& error) {
    for (const char* name : successes) {
        if (dbus_error_has_name(&error, name))
            return "";
    }
    const std::string text = error.message;
    std::string reason = shownText(text.substr(0, std::min(text.find('\n'), longestText)));
    if (reason.empty())
        reason = error.name;
    for (const auto& [name, advice] : advices) {
        if (dbus_error_has_name(&error, name))
            reason.append("; ").append(advice);
    }
    return reason;
}

} // namespace

void Attempt::Cancel::operator()(DBusPendingCall* call) const {
    dbus_pending_call_cancel(call);
    dbus_pending_call_unref(call);
}

void Attempt::begin(const Bluetooth::RemoteObject& proxy, Clock::time_point now) {
    const MessagePtr message(dbus_message_new_method_call(proxy.getDestination(), proxy.getPath(),
                                                          proxy.getInterface(), "Connect"));
    DBusPendingCall* call = nullptr;
    // The library's threads dispatch the reply, but none of them looks after libdbus's time-outs.
    if (!message || !dbus_connection_send_with_reply(proxy.getConnection(), message.get(), &call,
                                                     DBUS_TIMEOUT_INFINITE))
        return;
    m_call.reset(call);
    m_deadline = now + patience;
    const auto tell = [](DBusPendingCall* /*call*/, void* /*data*/) { tellConnection(); };
    if (call && (!dbus_pending_call_set_notify(call, tell, nullptr, nullptr) ||
                 dbus_pending_call_get_completed(call)))
        tellConnection();
}

std::optional<std::string> Attempt::takeResult(Clock::time_point now) {
    if (!m_call)
        return std::nullopt;
    if (!dbus_pending_call_get_completed(m_call.get())) {
        if (now < m_deadline)
            return std::nullopt;
        m_call.reset();
        return "bluetoothd does not answer; restart it";
    }
    const MessagePtr reply(dbus_pending_call_steal_reply(m_call.get()));
    m_call.reset();
    DBusError error = DBUS_ERROR_INIT;
    std::string reason;
    if (reply && dbus_set_error_from_message(&error, reply.get()))
        reason = reasonOf(error);
    dbus_error_free(&error);
    return reason;
}

} // namespace AutoConnectd
