// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_REMOTE_OBJECT_H
#define KESBLUETOOTH_REMOTE_OBJECT_H

#include <bluetooth/export.h>
#include <bluetooth/object_path.h>
#include <bluetooth/signal_handler.h>
#include <bluetooth/variant.h>

#include <dbus/dbus.h>
#include <pthread.h>

#include <atomic>
#include <list>
#include <string>
#include <vector>

/// @file
/// The base of all proxies, and the body of its receive thread.

namespace Bluetooth {

/// The proxy of one interface of one object of a remote D-Bus service.
///
/// A method call is made in steps: newMessage(), an append() for each argument, sendMessage() or
/// sendMessagePending(), then one getReplyValue() for the reply's first argument:
/// @code
///     RemoteObject bus("org.freedesktop.DBus", "/", "org.freedesktop.DBus", DBUS_BUS_SESSION);
///     std::string id;
///     if (bus.newMessage("GetId") != 0 || bus.sendMessage(true, -1) != 0 ||
///         bus.getReplyValue(id) != 0)
///         std::cerr << bus.getErrorMessage() << '\n';
/// @endcode
///
/// TYPES. append() sends the D-Bus types b, s, o, u, q, and v of b, s, u or q. getReplyValue()
/// reads s, o, b, u, q, ay, as, ao, and dictionaries with keys s or u and values s, or v of s, o,
/// b, u, q, n, as or ao. A value of any other type makes the whole dictionary unreadable (error 4).
/// What else there is, such as file descriptors, arguments a{sv} and second values of a reply, is
/// libdbus's own, on the connection of the proxy (getConnection()).
///
/// ERRORS. Operations that return int return 0 for success and -1 for failure, and record an error
/// number and message in the proxy. An error stays until resetError(): no success clears it.
///
/// THREADS. One thread at a time may use a proxy; different proxies may be used by different
/// threads at once. A call waits only for its own reply, never for another thread's. A debug
/// build of the library ends a program in which two threads use a proxy at once.
///
/// SIGNALS. A subscription lasts until its proxy is destroyed. The receive thread, which one proxy
/// of each bus starts, delivers the signals; until then they are kept in memory. Subscribe before
/// startLoop() where no signal may be missed.
class KESBLUETOOTH_API RemoteObject {
public:
    /// Makes a proxy of any object.
    /// @param destination bus name of the service, e.g. "org.bluez"
    /// @param path        object path, e.g. "/org/bluez/1234/hci0"
    /// @param interface   interface name, e.g. "org.bluez.Adapter"
    /// @param busType     the service's bus: DBUS_BUS_SYSTEM or DBUS_BUS_SESSION
    ///
    /// The names are copied. Null or invalid names are not reported here: calls through the proxy
    /// fail. Connects to the bus when the process has not yet; when that fails, calls fail too.
    RemoteObject(const char* destination, const char* path, const char* interface,
                 DBusBusType busType);

    RemoteObject(const RemoteObject&) = delete;
    RemoteObject& operator=(const RemoteObject&) = delete;

    /// Ends the proxy's subscriptions and frees its messages. The reference to the shared
    /// connection is kept on purpose: Connection::unref() is for programs that want to drop it.
    /// @dbus org.freedesktop.DBus.RemoveMatch(s rule), for each subscription
    ///
    /// Waits while another thread runs one of this proxy's callbacks, or asks for the sender of its
    /// signal: do not destroy it in a handler of requests on the same bus. A derived class has to
    /// call unsubscribeAll() in its destructor.
    virtual ~RemoteObject();

    /// The shared connection of the bus, not to be unreferenced; null when the bus could not be
    /// reached.
    DBusConnection* getConnection() const { return m_connection; }
    /// This process's unique name on the bus, e.g. ":1.42"; "" without a connection.
    const char* getConnectionName() const;
    /// The service's bus name as given to the constructor; valid while the proxy lives.
    const char* getDestination() const { return m_destination.c_str(); }
    /// The object path, likewise.
    const char* getPath() const { return m_path.c_str(); }
    /// The interface name, likewise.
    const char* getInterface() const { return m_interface.c_str(); }

    /// Begins a method call, in place of one begun before.
    /// @param method the method's name, e.g. "GetProperties"
    /// @return 0; -1 with error 1 for null (the call begun before is kept), error 6 for an invalid
    ///         name of the method or the proxy
    int newMessage(const char* method);

    /// Appends one argument, of D-Bus type b, to the call begun by newMessage().
    /// @return 0; -1 with error 1 for null, 3 for a path that does not begin with "/", else 7
    int append(bool value);
    /// Appends one argument of D-Bus type s. @return as append(bool)
    int append(const char* text);
    /// Appends one argument of D-Bus type o. @return as append(bool)
    int append(const ObjectPath& path);
    /// Appends one argument of D-Bus type u. @return as append(bool)
    int append(unsigned int value);
    /// Appends one argument of D-Bus type q. @return as append(bool)
    int append(unsigned short value);

    /// Appends one argument of D-Bus type v.
    /// @return 0; -1 with error 8 or 9. An array of strings or a signed integer cannot be sent:
    ///         nothing is appended and error 8 is recorded, yet the result is 0. Callers rely on
    ///         such a call still going out; hasError() reports it.
    int append(const Variant& value);

    /// Sends the call.
    /// @param wantReply true: blocks until the reply arrives, and holds it for getReplyValue();
    ///                  false: returns once the call is handed to the bus, and no reply will come
    /// @param timeoutMs how long to wait for the reply, in milliseconds; -1 for libdbus's default
    ///                  of 25 s; unused without a reply
    /// @return 0; -1 with error 10 (wantReply false) or error 11 and the service's or the bus's own
    ///         error message
    int sendMessage(bool wantReply, int timeoutMs);

    /// Sends the call and waits for its reply without a time limit, while this thread handles the
    /// messages that arrive, among them requests to objects that this process serves. Returns early
    /// when SIGTERM or SIGINT comes: a handler for both is installed and stays.
    /// @return 0 when the call was sent, also when no reply came (getReplyValue() then records
    ///         error 2); -1 with error 11. A reply that is a D-Bus error counts as a reply: reading
    ///         an object path from it gives its message.
    ///
    /// One thread of the process at a time may wait here.
    int sendMessagePending();

    /// Holds a reply as if it had arrived for this proxy's call.
    /// @param reply owned by the proxy afterwards; null is error 2
    int setReplyMessage(DBusMessage* reply);

    /// Reads the held reply's first argument, a string, and frees the reply.
    /// @return 0; -1 with error 2 when no reply is held, 4 for an argument of another type
    int getReplyValue(std::string& text);
    /// Reads a boolean. Otherwise as the one for a string.
    int getReplyValue(bool& value);
    /// Reads an unsigned number of 32 bits, type u. Otherwise as the one for a string.
    int getReplyValue(unsigned int& value);
    /// Reads an unsigned number of 16 bits, type q. Otherwise as the one for a string.
    int getReplyValue(unsigned short& value);
    /// Reads an array of bytes; an empty array of any type is an empty list. Otherwise as the one
    /// for a string.
    int getReplyValue(std::vector<unsigned char>& bytes);
    /// Reads an array of strings; an empty array of any type is an empty list. Otherwise as the one
    /// for a string.
    int getReplyValue(std::vector<std::string>& texts);
    /// Reads an array of object paths; an empty array of any type is an empty list. Otherwise as
    /// the one for a string.
    int getReplyValue(std::vector<ObjectPath>& paths);

    /// Reads an object path. A string in its place is the service's error message: it is stored in
    /// `path` too and recorded as error 11, and the result is -2. Any other type is error 11,
    /// result -1; no held reply is error 2, result -1.
    int getReplyValue(ObjectPath& path);

    /// Reads a dictionary (keys s or u, values as in Variant). Stops with success at an entry whose
    /// name is "". On failure `dict` holds the entries before the invalid one.
    /// @return 0; -1 with error 2 when no reply is held, 5 when it is not a dictionary, 4 for an
    ///         invalid entry
    int getReplyValue(Dict& dict);

    /// Clears the error.
    void resetError();
    /// Whether an operation failed since resetError().
    bool hasError() const { return m_errorNumber != 0; }
    /// The error number, 0 for none; see getErrorMessage().
    int getErrorNumber() const { return m_errorNumber; }
    /// The error message: "" for none, otherwise by getErrorNumber():
    ///
    /// | number | message                            |
    /// |--------|------------------------------------|
    /// | 1      | "Parameter is null"                |
    /// | 2      | "Reply message is null"            |
    /// | 3      | "Invalid path"                     |
    /// | 4      | "Invalid reply value"              |
    /// | 5      | "Invalid reply format"             |
    /// | 6      | "Failed to create message"         |
    /// | 7      | "Failed to append args to message" |
    /// | 8      | "Failed to append args = iterator" |
    /// | 9      | "Failed to open container"         |
    /// | 10     | "Failed to send message"           |
    /// | 11     | the D-Bus error's own message      |
    std::string getErrorMessage();
    /// The D-Bus error's name, e.g. "org.bluez.Error.Rejected": what a program decides by, since
    /// messages are for people and change.
    /// @return "" for an error that is not a D-Bus error, and for none; valid until the next
    ///         operation of this proxy
    const char* getErrorName() const;

    /// The destination, the object path and the interface, in three lines.
    std::string getInfo() const;
    /// Writes getInfo() to standard output.
    void printInfo() const;

    /// Subscribes to a signal of this proxy's interface and object path. A signal that arrives
    /// calls back every proxy that subscribed to a signal of its interface and name, whichever
    /// object sent it. Subscribing twice calls back twice. This operation is for signals without
    /// arguments, the others are for their kinds.
    /// @dbus org.freedesktop.DBus.AddMatch(s rule)
    /// @param member   the signal's name, e.g. "PropertyChanged"
    /// @param callback must not be null; called on the receive thread, here with the proxy that
    ///                 runs the loop, in all other kinds with this proxy
    /// @return 0; -1 when the bus refuses or cannot be reached, or an argument is null or invalid
    ///         (logged; nothing is subscribed)
    ///
    /// Blocks until the bus has replied.
    int setSignalHandlerNoArgument(const char* member, NoArgumentCallback callback);
    /// For signals with a string. Otherwise as setSignalHandlerNoArgument().
    int setSignalHandlerString(const char* member, StringCallback callback);
    /// For signals with an object path. Otherwise as setSignalHandlerNoArgument().
    int setSignalHandlerObjectPath(const char* member, ObjectPathCallback callback);
    /// For signals with a name and a value. Otherwise as setSignalHandlerNoArgument().
    int setSignalHandlerStringVariant(const char* member, StringVariantCallback callback);
    /// For signals with a string and properties. Otherwise as setSignalHandlerNoArgument().
    int setSignalHandlerStringDict(const char* member, StringDictCallback callback);

    /// Starts the receive thread of this proxy's bus. One for each bus serves all its proxies.
    /// The proxy must outlive the thread: stopLoop() and waitLoop() come before its destruction.
    /// @return 0, or pthread_create's error number
    int startLoop();
    /// Makes every receive thread of the process end, for good: none can run afterwards. A thread
    /// ends after the callback that it runs, at once when it is idle; signals not delivered by then
    /// stay undelivered. Safe in a signal handler.
    void stopLoop();
    /// Waits for this proxy's receive thread to end.
    /// @return 0, or pthread_join's error number: ESRCH when startLoop() was not called or another
    ///         waitLoop() came first; EDEADLK in a callback, and another thread may still wait
    int waitLoop();

    /// Dispatches one signal to the subscriptions without arguments. The receive thread calls this
    /// and the four that follow, for each signal.
    void signalHandlerDispatcherNoArgument(DBusMessage* message);
    /// Dispatches it to those with a string.
    void signalHandlerDispatcherString(DBusMessage* message);
    /// Dispatches it to those with an object path.
    void signalHandlerDispatcherObjectPath(DBusMessage* message);
    /// Dispatches it to those with a name and a value.
    void signalHandlerDispatcherStringVariant(DBusMessage* message);
    /// Dispatches it to those with a string and properties.
    void signalHandlerDispatcherStringDict(DBusMessage* message);

    /// Decodes the name of a dictionary entry, or of a (name, value) pair of arguments.
    /// @return 0; -1 with error 4, which leaves that half of `entry` unchanged
    int parseEntryName(DBusMessageIter& iter, DictEntry& entry);
    /// Decodes its value. @return as parseEntryName()
    int parseEntryValue(DBusMessageIter& iter, DictEntry& entry);

protected:
    /// Ends this proxy's subscriptions, and waits while another thread runs one of its callbacks.
    /// What a derived class has is gone when the base's destructor does this, so the destructor of
    /// every derived class does it first, whatever it adds:
    /// @code
    ///     Headset::~Headset() { unsubscribeAll(); }
    /// @endcode
    /// The proxies of this library do.
    /// @dbus org.freedesktop.DBus.RemoveMatch(s rule), for each subscription
    void unsubscribeAll();

private:
    friend void* receiveSignal(void* proxy);
    friend class Scanner; // takes over the Bluetooth daemon's errors

    enum ErrorNumber : int;
    enum class DictResult;

    int recordError(ErrorNumber number);
    int recordError(ErrorNumber number, const char* text);
    KESBLUETOOTH_LOCAL int recordDBusError(const char* name, const char* text);
    int appendBasic(int type, const void* value);
    DictResult parseDictionary(DBusMessageIter& iter, Dict& dict);
    KESBLUETOOTH_LOCAL DBusMessage* takeReply(DBusMessageIter& first);
    template <class Value>
    KESBLUETOOTH_LOCAL int readReply(Value& value);

    template <class Callback>
    KESBLUETOOTH_LOCAL int subscribe(const char* member, Callback callback);
    std::string matchRule(const std::string& member) const;
    static void dispatch(void* proxy, DBusMessage* message);

    std::string m_destination;
    std::string m_path;
    std::string m_interface;
    DBusConnection* m_connection;
    DBusMessage* m_message = nullptr;
    DBusMessage* m_reply = nullptr;
    DBusBusType m_busType;
    std::atomic<pthread_t> m_loopThread{0}; // 0: none, or joined
    std::atomic<int> m_errorNumber{0};      // a loop proxy's is also set by the receive thread
    std::string m_errorText;                // a D-Bus error's name follows its message after a NUL
    bool m_usable;                          // destination, path and interface are valid names

    // The subscriptions of all proxies, by kind.
    static std::list<SignalHandler<NoArgumentCallback>>& signalHandlerVectorNoArgument;
    static std::list<SignalHandler<StringCallback>>& signalHandlerVectorString;
    static std::list<SignalHandler<ObjectPathCallback>>& signalHandlerVectorObjectPath;
    static std::list<SignalHandler<StringVariantCallback>>& signalHandlerVectorStringVariant;
    static std::list<SignalHandler<StringDictCallback>>& signalHandlerVectorStringDict;
};

/// Body of the receive thread: delivers signals on behalf of `proxy` (a RemoteObject*) until
/// stopLoop(). startLoop() runs it in a thread of its own. @return null
KESBLUETOOTH_API void* receiveSignal(void* proxy);

} // namespace Bluetooth

#endif
