// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVER_OBJECT_H
#define KESBLUETOOTH_SERVER_OBJECT_H

#include <bluetooth/export.h>

#include <dbus/dbus-glib.h>
#include <dbus/dbus.h>
#include <glib-object.h>
#include <glib.h>

#include <memory>
#include <mutex>

/// @file
/// The frame of a served object, and its timer.

namespace Bluetooth {

class Finders;

/// The frame of an object that this library serves on a bus with dbus-glib: the bus connection, the
/// well-known name, and a GLib main loop with a timer of one second. Its one subclass is
/// ScannerServer, and startLoop() runs for no other.
///
/// THREADS. The thread in startLoop() runs the default GLib main context: method calls to the
/// served object and callbackThreadHandler() run on it. Any thread may call quitLoop(); one at a
/// time may call everything else.
class KESBLUETOOTH_API ServerObject {
public:
    /// Connects to the bus. Nothing is requested or registered yet, and no failure is reported:
    /// when the bus cannot be reached, prepareObjectInfo() fails. The process does not end when the
    /// bus goes away later.
    /// @param busName well-known name to request, e.g. "com.kestrine.bluetooth"
    /// @param path    object path to serve at, e.g. "/"
    /// @param type    the bus: DBUS_BUS_SYSTEM or DBUS_BUS_SESSION
    ///
    /// The strings are not copied: they must outlive the object.
    ServerObject(const char* busName, const char* path, DBusBusType type);
    ServerObject(const ServerObject&) = delete;
    ServerObject& operator=(const ServerObject&) = delete;

    /// The object stays served until the GObject is destroyed, and the name owned until the
    /// connection is closed.
    virtual ~ServerObject();

    /// Called every second while the loop runs.
    /// @param data this object
    /// @return whether to be called again; the base does nothing and returns 1
    virtual int callbackThreadHandler(void* data);

    /// Connects to the bus if that has not succeeded yet. A failure is not reported.
    void getConnection();

    /// Requests the bus name and serves an object at the path.
    /// @dbus org.freedesktop.DBus.RequestName(s name, u flags) -> u
    /// @param type   the object's type, to which the method table is attached
    /// @param info   method table as dbus-binding-tool makes it; must live as long as the type
    /// @param object not owned; served until it is destroyed
    /// @return false (logged) when the bus refuses, another object is at the path, or the bus name
    ///         or the path given to the constructor is invalid. Whether this process owns the name,
    ///         or waits for it, is not checked.
    ///
    /// Blocks until the bus replies.
    bool prepareObjectInfo(GType type, const DBusGObjectInfo* info, GObject* object);

    /// Runs the main loop on this thread until quitLoop(), while a receive thread delivers BlueZ's
    /// signals. Returns at once when the loop runs already or this is not a ScannerServer.
    ///
    /// When the loop has ended the receive thread is stopped, for good (see
    /// RemoteObject::stopLoop()): a second startLoop() of the process runs the main loop only.
    void startLoop();

    /// Ends startLoop(); does nothing when it does not run. Any thread.
    void quitLoop();

    /// Writes to standard output, in three lines, what getBusName(), getPath() and getInterface()
    /// return.
    void printInfo() const;

    /// This process's unique name on the bus, e.g. ":1.42"; "" without a connection.
    const char* getConnectionName() const;

    /// "org.freedesktop.DBus": on purpose this and the next two are the bus's own, whatever name
    /// and path are served. "" without a connection.
    const char* getBusName() const;
    /// "/org/freedesktop/DBus"; "" without a connection.
    const char* getPath() const;
    /// "org.freedesktop.DBus"; "" without a connection.
    const char* getInterface() const;

private:
    friend class Finders; // awaits that the connection has written its answers

    bool setLoop(const std::shared_ptr<GMainLoop>& loop);

    std::mutex m_loopMutex; // guards m_loop; nothing is called while it is held
    std::shared_ptr<GMainLoop> m_loop;
    DBusGProxy* m_busProxy = nullptr;
    DBusGConnection* m_connection = nullptr;
    DBusBusType m_busType;
    const char* m_busName;
    const char* m_path;
};

/// The timer of a ServerObject's main loop.
/// @param data the ServerObject
/// @return what its callbackThreadHandler() returns
KESBLUETOOTH_API int updateTimer(void* data);

} // namespace Bluetooth

#endif
