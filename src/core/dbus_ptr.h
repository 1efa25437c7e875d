// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_DBUS_PTR_H
#define KESBLUETOOTH_CORE_DBUS_PTR_H

#include <dbus/dbus.h>

#include <memory>

namespace Bluetooth {

struct DBusUnref {
    void operator()(DBusMessage* message) const { dbus_message_unref(message); }
    void operator()(DBusPendingCall* pending) const { dbus_pending_call_unref(pending); }
};

/// One reference to a message.
using MessagePtr = std::unique_ptr<DBusMessage, DBusUnref>;
/// One reference to a pending call.
using PendingPtr = std::unique_ptr<DBusPendingCall, DBusUnref>;

/// A D-Bus error that frees itself.
class ScopedError {
public:
    ScopedError() { dbus_error_init(&m_error); }
    ~ScopedError() { dbus_error_free(&m_error); }
    ScopedError(const ScopedError&) = delete;
    ScopedError& operator=(const ScopedError&) = delete;

    DBusError& get() { return m_error; }
    operator DBusError*() { return &m_error; }
    bool isSet() const { return dbus_error_is_set(&m_error); }
    void setNoMemory() {
        dbus_set_error_const(&m_error, DBUS_ERROR_NO_MEMORY, "Not enough memory");
    }
    /// The message, "" when none is set.
    const char* message() const { return m_error.message ? m_error.message : ""; }
    /// The error's name, likewise.
    const char* name() const { return m_error.name ? m_error.name : ""; }

private:
    DBusError m_error;
};

} // namespace Bluetooth

#endif
