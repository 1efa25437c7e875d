// SPDX-License-Identifier: LGPL-2.1-or-later
// Method calls, their replies and errors.

#include "core/bus_link.h"
#include "core/dbus_ptr.h"
#include "core/method_call_message.h"
#include "core/proxy_use.h"
#include "core/remote_object_private.h"

#include <signal.h>

#include <cstring>

namespace Bluetooth {

namespace {

/// Set by SIGTERM and SIGINT once sendMessagePending() has run; ends its wait, or the next one's.
WakingFlag interrupted;

void handleInterrupt(int) {
    interrupted.raise();
}

void installInterruptHandlers() {
    struct sigaction action = {};
    action.sa_handler = handleInterrupt;
    sigemptyset(&action.sa_mask);
    action.sa_flags = SA_NOCLDSTOP;
    sigaction(SIGTERM, &action, nullptr);
    sigaction(SIGINT, &action, nullptr);
}

/// The texts of the errors 1 to 10.
constexpr const char* errorTexts[] = {
    "Parameter is null",
    "Reply message is null",
    "Invalid path",
    "Invalid reply value",
    "Invalid reply format",
    "Failed to create message",
    "Failed to append args to message",
    "Failed to append args = iterator",
    "Failed to open container",
    "Failed to send message",
};

} // namespace

int RemoteObject::newMessage(const char* method) {
    const ProxyUse use(*this);
    if (!method)
        return recordError(errorNullParameter);
    if (m_message)
        dbus_message_unref(m_message);
    m_message =
        m_usable ? newMethodCall(m_destination, m_path, m_interface, method).release() : nullptr;
    return m_message ? 0 : recordError(errorCreateMessage);
}

int RemoteObject::append(bool value) {
    const dbus_bool_t boolean = value;
    return appendBasic(DBUS_TYPE_BOOLEAN, &boolean);
}

int RemoteObject::append(unsigned int value) {
    return appendBasic(DBUS_TYPE_UINT32, &value);
}

int RemoteObject::append(unsigned short value) {
    return appendBasic(DBUS_TYPE_UINT16, &value);
}

int RemoteObject::append(const char* text) {
    if (!text)
        return recordError(errorNullParameter);
    if (!dbus_validate_utf8(text, nullptr))
        return recordError(errorAppendArgs);
    return appendBasic(DBUS_TYPE_STRING, &text);
}

int RemoteObject::append(const ObjectPath& path) {
    const char* text = path.c_str();
    if (!text)
        return recordError(errorNullParameter);
    if (text[0] != '/')
        return recordError(errorInvalidPath);
    if (!dbus_validate_path(text, nullptr))
        return recordError(errorAppendArgs);
    return appendBasic(DBUS_TYPE_OBJECT_PATH, &text);
}

int RemoteObject::appendBasic(int type, const void* value) {
    const ProxyUse use(*this);
    if (!m_message || !dbus_message_append_args(m_message, type, value, DBUS_TYPE_INVALID))
        return recordError(errorAppendArgs);
    return 0;
}

int RemoteObject::sendMessage(bool wantReply, int timeoutMs) {
    const ProxyUse use(*this);
    const MessagePtr message(std::exchange(m_message, nullptr));
    MessagePtr(std::exchange(m_reply, nullptr)).reset();
    BusLink* link = BusLink::of(m_connection);

    if (!wantReply) {
        if (!message || !link)
            return recordError(errorSend);
        dbus_message_set_no_reply(message.get(), true);
        return link->send(message.get()) ? 0 : recordError(errorSend);
    }
    if (!message)
        return recordError(errorDBus, "There is no message to send");
    if (!link)
        return recordDBusError(DBUS_ERROR_DISCONNECTED, "Not connected to the bus");
    if (timeoutMs < -1)
        return recordError(errorDBus, "Invalid time-out");
    ScopedError error;
    m_reply = link->call(message.get(), timeoutMs, error.get()).release();
    return m_reply ? 0 : recordDBusError(error.name(), error.message());
}

int RemoteObject::sendMessagePending() {
    const ProxyUse use(*this);
    const MessagePtr message(std::exchange(m_message, nullptr));
    MessagePtr(std::exchange(m_reply, nullptr)).reset();
    BusLink* link = BusLink::of(m_connection);

    MessagePtr reply;
    const bool sent = message && link &&
                      link->converse(message.get(), interrupted, installInterruptHandlers, reply);
    if (reply)
        setReplyMessage(reply.release());
    interrupted.lower();
    return sent ? 0 : recordError(errorDBus, "");
}

int RemoteObject::setReplyMessage(DBusMessage* reply) {
    const ProxyUse use(*this);
    if (!reply)
        return recordError(errorNullReply);
    if (m_reply)
        dbus_message_unref(m_reply);
    m_reply = reply;
    return 0;
}

void RemoteObject::resetError() {
    const ProxyUse use(*this);
    m_errorNumber = 0;
    m_errorText.clear();
}

std::string RemoteObject::getErrorMessage() {
    const ProxyUse use(*this);
    const int number = m_errorNumber;
    if (number >= errorNullParameter && number <= errorSend)
        m_errorText = errorTexts[number - 1];
    else if (number > errorDBus)
        m_errorText = "Unknown error";
    return m_errorText.c_str(); // without the name
}

const char* RemoteObject::getErrorName() const {
    const ProxyUse use(*this);
    const char* const text = m_errorText.c_str();
    const std::size_t length = std::strlen(text);
    return m_errorNumber == errorDBus && length < m_errorText.size() ? text + length + 1 : "";
}

int RemoteObject::recordError(ErrorNumber number) {
    m_errorNumber = number;
    return -1;
}

int RemoteObject::recordError(ErrorNumber number, const char* text) {
    m_errorText = text;
    return recordError(number);
}

int RemoteObject::recordDBusError(const char* name, const char* text) {
    recordError(errorDBus, text);
    if (name)
        m_errorText.append(1, '\0').append(name);
    return -1;
}

} // namespace Bluetooth
