// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_OBJECT_H
#define KESBLUETOOTH_BLUEZ_OBJECT_H

#include <bluetooth/remote_object.h>

namespace Bluetooth {

/// What the proxies of all objects of the Bluetooth daemon share (bus name org.bluez on the system
/// bus): properties, and whether the daemon is on the bus.
///
/// CALLS. Each operation of this class and of those derived from it that calls the daemon first
/// resets the proxy's error. When it fails, the error message is logged, and
/// getErrorMessage() returns it until the next call. An operation that returns nothing but success
/// or failure does not wait for the daemon: 0 means that the call was handed to the bus, not that
/// the daemon carried it out. The others block until the daemon replies, at most libdbus's default
/// time-out (25 s). An operation that returns proxies then also asks the bus whether the daemon is
/// still there, for each of them.
///
/// OTHER METHODS. A method of BlueZ without an operation here is called in steps, with any
/// time-out, and so is one whose success matters. Without a class, an interface has a BluezObject:
/// @code
///     BluezObject service(adapter->getPath(), "org.bluez.Service");
///     unsigned int handle = 0;
///     if (service.newMessage("AddRecord") != 0 || service.append(record) != 0 ||
///         service.sendMessage(true, -1) != 0 || service.getReplyValue(handle) != 0)
///         std::cerr << service.getErrorMessage() << '\n';
/// @endcode
/// RemoteObject says which D-Bus types can be sent and read so.
///
/// OWNERSHIP. The proxies, lists and dictionaries that an operation returns are new each time; the
/// caller owns and deletes them.
///
/// THREADS. One thread at a time may use a proxy; different proxies may be used by different
/// threads at once. Signal callbacks run on the receive thread, which startLoop() starts.
class KESBLUETOOTH_API BluezObject : public RemoteObject {
public:
    /// Makes a proxy of any of the daemon's interfaces; where one has a class of its own, use that.
    /// @param path      object path, e.g. "/org/bluez/1234/hci0"
    /// @param interface interface name, e.g. "org.bluez.Adapter"
    BluezObject(const char* path, const char* interface);
    ~BluezObject() override;

    /// Reads all properties of the object.
    /// @dbus GetProperties() -> a{sv}
    /// @return a new dictionary, deleted by the caller; null on any failure, never a part of it
    ///
    /// Blocks until the daemon replies, at most 25 s.
    virtual Dict* getProperties();

    /// Changes a property, without waiting for the daemon's reply. Of the interfaces that have a
    /// class only org.bluez.Adapter, Device and Headset have SetProperty in BlueZ 4.101.
    /// @dbus SetProperty(s name, v value)
    /// @param name  e.g. "Powered"
    /// @param value must have the property's own type. An array of strings or a signed integer
    ///              cannot be sent: the call goes out without it, the result is 0, and the error is
    ///              logged.
    /// @return 0 when the call was handed to the bus, otherwise -1
    int setProperty(const char* name, const Variant& value);

    /// Subscribes to PropertyChanged of this interface.
    /// @dbus signal PropertyChanged(s name, v value)
    /// @param callback called on the receive thread with this proxy, the property's name and its
    ///                 new value; null selects propertyChangedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setPropertyChangedHandler(StringVariantCallback callback);

    /// Default callback. Prints "NAME was changed in PATH with VALUE".
    static void propertyChangedHandler(RemoteObject* sender, const char* name,
                                       const Variant* value);

    /// Whether the Bluetooth daemon is on the system bus at this moment. The bus is asked each
    /// time, once, since the daemon may come and go.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @return false also when the bus cannot be asked
    ///
    /// Blocks until the bus replies, at most 25 s.
    static bool hasBluetoothd();
};

} // namespace Bluetooth

#endif
