#ifndef KESBLUETOOTH_AGENT_H
#define KESBLUETOOTH_AGENT_H

#include <bluetooth/export.h>

#include <dbus/dbus.h>

#include <memory>
#include <string>

namespace Bluetooth {

/// A pairing agent that this process serves on the system bus (interface org.bluez.Agent). The
/// daemon asks it for PIN codes, passkeys, confirmations and authorisations; it answers at once, or
/// after a delay, from values that were set before. It never asks a user.
/// @code
///     Agent agent;
///     agent.setPasskeyValue("0000");
///     if (agent.registerPath() == 0) {
///         std::unique_ptr<Device> device(adapter->createPairedDevice(address, agent));
///         agent.unregisterPath();
///     }
/// @endcode
///
/// Threads: requests are handled on whichever thread dispatches the system bus connection, e.g. the
/// one that waits in Adapter::createPairedDevice(); the receive thread drops them unanswered. Set
/// everything before registerPath(): nothing is locked.
/// Lifetime: unregisterPath() comes before the destruction, which does not do it.
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

    /// Begins to serve requests at "/org/bluez/agent_" and the process id. The path is the same for
    /// all agents of a process: one of them at a time can be registered.
    /// @return 0; -1 when another agent is registered or the bus cannot be reached (logged)
    int registerPath();
    /// Ceases to serve requests at this agent's path, whichever agent of the process does.
    /// @return 0; -1 when none is registered there or the bus cannot be reached (logged)
    int unregisterPath();

    /// The object path, valid until the next registerPath(); "" before the first.
    const char* getPath() const { return m_path.c_str(); }
    /// "org.bluez.Agent".
    const char* getInterface() const;

    /// Sets what is answered to RequestPinCode, as it is, and to RequestPasskey, as a number: the
    /// leading decimal digits, 0 when there are none. "5820" by default.
    /// @param value copied. One that is not UTF-8 cannot be sent as a PIN: that answer then has no
    ///              value (logged), which the daemon takes for a refusal.
    /// @return 0; -1 for null (logged)
    int setPasskeyValue(const char* value);
    /// The text set, valid until the next setPasskeyValue().
    const char* getPasskeyValue() const { return m_passkeyValue.c_str(); }

    /// Sets how long to wait before a PIN code, a passkey or a confirmation is given. The thread
    /// that dispatches the connection is blocked meanwhile, whatever signals come.
    /// @param seconds 0 (the default) for not at all
    /// @return 0; -1 when negative (logged)
    int setPasskeyDelay(int seconds);
    /// What setPasskeyDelay() set, in seconds.
    int getPasskeyDelay() const { return m_passkeyDelay; }

    /// Sets whether passkeys, confirmations and authorisations are refused with
    /// org.bluez.Error.Rejected, at once; false by default. PIN codes are given all the same.
    void setReject(bool reject) { m_reject = reject; }
    /// What setReject() set.
    bool getReject() const { return m_reject; }

    /// Replaces the function that gets every message to the agent's path. It serves from the next
    /// registerPath() on.
    /// @param dispatcher gets this agent as user data
    /// @return 0; -1 for null
    int setDispatcher(DBusObjectPathMessageFunction dispatcher);

    /// Sets what Adapter tells the daemon about the agent: one of the constants above.
    /// @param capability not copied: it must outlive the agent
    /// @return 0; -1 for null
    int setCapability(const char* capability);
    /// What setCapability() set.
    const char* getCapability() const { return m_capability; }

    /// What serves the agent's path unless setDispatcher() says otherwise: passes the message to
    /// the handler of its method. Anything else is logged and not handled.
    static DBusHandlerResult handlerDispatcher(DBusConnection* connection, DBusMessage* message,
                                               void* agent);
    /// Does nothing; for programs that fill a handler table of their own.
    static void handlerUnregisterDispatcher(DBusConnection* connection, void* agent);

    /// Answers RequestPinCode on the connection that it came from. The other handlers do the same
    /// for their methods.
    /// @return DBUS_HANDLER_RESULT_HANDLED when answered. Arguments that are not the method's are
    ///         logged and not answered, and are NOT_YET_HANDLED (but HANDLED for RequestPinCode).
    ///         NEED_MEMORY when no answer could be made (logged).
    static DBusHandlerResult requestPinCode(DBusConnection* connection, DBusMessage* message,
                                            void* agent);
    /// Answers RequestPasskey. @return as requestPinCode()
    static DBusHandlerResult requestPasskey(DBusConnection* connection, DBusMessage* message,
                                            void* agent);
    /// Answers RequestConfirmation. @return as requestPinCode()
    static DBusHandlerResult requestConfirmation(DBusConnection* connection, DBusMessage* message,
                                                 void* agent);
    /// Answers Authorize. @return as requestPinCode()
    static DBusHandlerResult authorize(DBusConnection* connection, DBusMessage* message,
                                       void* agent);
    /// Answers Cancel: the daemon gave a request up. @return as requestPinCode()
    static DBusHandlerResult cancel(DBusConnection* connection, DBusMessage* message, void* agent);
    /// Answers Release: the daemon needs the agent no longer. @return as requestPinCode()
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
