// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_AGENT_H
#define KESBLUETOOTH_AGENT_H

#include <bluetooth/export.h>

#include <dbus/dbus.h>

#include <memory>
#include <string>

namespace Bluetooth {

/// A pairing agent that this process serves on the system bus (interface org.bluez.Agent). The
/// daemon asks it for PIN codes, passkeys, confirmations and authorisations; it replies at once, or
/// after a delay, with values that were set before. It never asks a user. The daemon's requests
/// without a handler here, such as DisplayPinCode, get the error UnknownMethod.
/// @code
///     Agent agent;
///     agent.setPasskeyValue("0000");
///     if (agent.registerPath() == 0) {
///         std::unique_ptr<Device> device(adapter->createPairedDevice(address, agent));
///         agent.unregisterPath();
///     }
/// @endcode
///
/// Threads: requests are handled on the thread that dispatches the system bus connection, e.g. the
/// one that waits in Adapter::createPairedDevice(); the receive thread drops them unanswered. Set
/// everything before registerPath(): nothing is locked.
/// Lifetime: call unregisterPath() before the destruction, which does not do it.
class KESBLUETOOTH_API Agent {
public:
    // What the agent can do, for setCapability().
    static const char* const PSZ_NO_INPUT_NO_OUTPUT; ///< "NoInputNoOutput"
    static const char* const PSZ_KEYBOARD_ONLY;      ///< "KeyboardOnly"
    static const char* const PSZ_DISPLAY_YES_NO;     ///< "DisplayYesNo", the default
    static const char* const PSZ_DISPLAY_ONLY;       ///< "DisplayOnly"

    Agent();
    Agent(const Agent&) = delete;
    Agent& operator=(const Agent&) = delete;
    virtual ~Agent();

    /// Starts to serve requests at the object path "/org/bluez/agent_PID", with the process id.
    /// All agents of a process have this path: one at a time can be registered.
    /// @return 0; -1 when another agent is registered or the bus cannot be reached (logged)
    int registerPath();
    /// Stops serving requests at that path, whichever agent of the process does.
    /// @return 0; -1 when none is registered there or the bus cannot be reached (logged)
    int unregisterPath();

    /// The object path, valid until the next registerPath(); "" before the first.
    const char* getPath() const { return m_path.c_str(); }
    /// "org.bluez.Agent".
    const char* getInterface() const;

    /// Sets the reply to RequestPinCode, as it is, and to RequestPasskey, as a number: the leading
    /// decimal digits, 0 when there are none. "5820" by default.
    /// @param value copied. Invalid UTF-8 cannot be sent as a PIN code: that reply then has no
    ///              value (logged), which the daemon takes for a refusal.
    /// @return 0; -1 for null (logged)
    int setPasskeyValue(const char* value);
    /// The value set, valid until the next setPasskeyValue().
    const char* getPasskeyValue() const { return m_passkeyValue.c_str(); }

    /// Sets how long to wait before a PIN code, a passkey or a confirmation is sent. The thread
    /// that dispatches the connection is blocked meanwhile, and no signal of the system ends that.
    /// @param seconds 0 (the default) for no delay
    /// @return 0; -1 when negative (logged)
    int setPasskeyDelay(int seconds);
    /// What setPasskeyDelay() set, in seconds.
    int getPasskeyDelay() const { return m_passkeyDelay; }

    /// Sets whether passkeys, confirmations and authorisations are refused with
    /// org.bluez.Error.Rejected, at once; false by default. PIN codes are sent all the same.
    void setReject(bool reject) { m_reject = reject; }
    /// What setReject() set.
    bool getReject() const { return m_reject; }

    /// Replaces the function that gets every message to the agent's path, from the next
    /// registerPath() on.
    /// @param dispatcher gets this agent as user data
    /// @return 0; -1 for null
    int setDispatcher(DBusObjectPathMessageFunction dispatcher);

    /// Sets the capability that Adapter sends to the daemon: one of the constants above.
    /// @param capability not copied: must outlive the agent
    /// @return 0; -1 for null
    int setCapability(const char* capability);
    /// What setCapability() set.
    const char* getCapability() const { return m_capability; }

    /// Serves the agent's path unless setDispatcher() replaced it: passes a request to the handler
    /// of its method. Any other message is logged and not handled.
    static DBusHandlerResult handlerDispatcher(DBusConnection* connection, DBusMessage* message,
                                               void* agent);
    /// Does nothing; for programs that fill a handler table of their own.
    static void handlerUnregisterDispatcher(DBusConnection* connection, void* agent);

    /// Replies to RequestPinCode with the passkey value, on the connection of the request.
    /// @dbus served: RequestPinCode(o device) -> s
    /// @return DBUS_HANDLER_RESULT_HANDLED after a reply. Invalid arguments are logged and get no
    ///         reply: NOT_YET_HANDLED (but HANDLED for RequestPinCode). NEED_MEMORY when no reply
    ///         could be made (logged).
    static DBusHandlerResult requestPinCode(DBusConnection* connection, DBusMessage* message,
                                            void* agent);
    /// Replies to RequestPasskey with the passkey value as a number, or refuses.
    /// @dbus served: RequestPasskey(o device) -> u
    /// @return as requestPinCode()
    static DBusHandlerResult requestPasskey(DBusConnection* connection, DBusMessage* message,
                                            void* agent);
    /// Replies to RequestConfirmation: confirms the passkey, or refuses.
    /// @dbus served: RequestConfirmation(o device, u passkey)
    /// @return as requestPinCode()
    static DBusHandlerResult requestConfirmation(DBusConnection* connection, DBusMessage* message,
                                                 void* agent);
    /// Replies to Authorize: allows the service, or refuses.
    /// @dbus served: Authorize(o device, s uuid)
    /// @return as requestPinCode()
    static DBusHandlerResult authorize(DBusConnection* connection, DBusMessage* message,
                                       void* agent);
    /// Replies to Cancel: the daemon gave up a request.
    /// @dbus served: Cancel()
    /// @return as requestPinCode()
    static DBusHandlerResult cancel(DBusConnection* connection, DBusMessage* message, void* agent);
    /// Replies to Release: the daemon no longer needs the agent.
    /// @dbus served: Release()
    /// @return as requestPinCode()
    static DBusHandlerResult release(DBusConnection* connection, DBusMessage* message, void* agent);

    /// Does nothing, and handlerDispatcher() does not call it. @return NOT_YET_HANDLED
    static DBusHandlerResult displayPasskey(DBusConnection* connection, DBusMessage* message,
                                            void* agent);
    /// Does nothing, and handlerDispatcher() does not call it. @return HANDLED
    static DBusHandlerResult confirmModeChange(DBusConnection* connection, DBusMessage* message,
                                               void* agent);

private:
    std::string m_path;
    std::unique_ptr<DBusObjectPathVTable> m_handlers;
    std::string m_passkeyValue;
    int m_passkeyDelay = 0;
    bool m_reject = false;
    const char* m_capability;
};

} // namespace Bluetooth

#endif
