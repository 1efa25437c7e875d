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

/// The frame of an object that this library serves on a bus with dbus-glib: the bus connection, the
/// well-known name, and a GLib main loop with a timer of one second. Its one subclass is
/// ScannerServer, and startLoop() runs for no other.
///
/// THREADS. The thread in startLoop() runs the default GLib main context: method calls to the
/// served object and callbackThreadHandler() come on it. quitLoop() may be called from any thread,
/// everything else from one at a time.
class KESBLUETOOTH_API ServerObject {
public:
    /// Connects to the bus. Nothing is requested or registered yet, and nothing is reported: when
    /// the bus cannot be reached, prepareObjectInfo() fails. The process does not end when the bus
    /// goes away later.
    /// @param busName well-known name to request, e.g. "com.kestrine.bluetooth"
    /// @param path    object path to serve at, e.g. "/"
    /// @param type    the bus: DBUS_BUS_SYSTEM or DBUS_BUS_SESSION
    ///
    /// The texts are borrowed: they must outlive the object.
    ServerObject(const char* busName, const char* path, DBusBusType type);
    ServerObject(const ServerObject&) = delete;
    ServerObject& operator=(const ServerObject&) = delete;

    /// The served object stays registered and the name owned: they end with the GObject and with
    /// the connection.
    virtual ~ServerObject();

    /// Called every second while the loop runs.
    /// @param data this object
    /// @return whether to be called again; the base says yes and does nothing
    virtual int callbackThreadHandler(void* data);

    /// Connects to the bus if that has not succeeded yet. A failure is not reported.
    void getConnection();

    /// Requests the bus name and serves an object at the path.
    /// @param type   the object's type, to which the method table is attached
    /// @param info   method table as dbus-binding-tool makes it; must live as long as the type
    /// @param object not owned; served until it is destroyed
    /// @return false, logged, when the bus did not take the request, the path is taken, or the bus
    ///         name or the path given to the constructor is none. Whether
    ///         the name came to be owned, or this process only waits for it, is not looked at.
    ///
    /// Blocks until the bus answers.
    bool prepareObjectInfo(GType type, const DBusGObjectInfo* info, GObject* object);

    /// Runs the main loop on this thread until quitLoop(), while BlueZ's signals are received on a
    /// thread of their own. Returns at once when the loop runs already or this is no ScannerServer.
    ///
    /// The receive thread is asked to stop when the loop has ended. That is for good (see
    /// RemoteObject::stopLoop()): a second startLoop() of the process runs the main loop only.
    void startLoop();

    /// Ends startLoop(); does nothing when it does not run. Any thread.
    void quitLoop();

    /// Writes three lines that tell what the three getters below give.
    void printInfo() const;

    /// This process's unique name on the bus, e.g. ":1.42"; "" without a connection.
    const char* getConnectionName() const;

    /// "org.freedesktop.DBus": on purpose this and the next two tell about the bus itself, whatever
    /// name and path are served. "" without a connection.
    const char* getBusName() const;
    /// "/org/freedesktop/DBus"; "" without a connection.
    const char* getPath() const;
    /// "org.freedesktop.DBus"; "" without a connection.
    const char* getInterface() const;

private:
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
