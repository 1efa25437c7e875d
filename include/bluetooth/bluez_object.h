#ifndef KESBLUETOOTH_BLUEZ_OBJECT_H
#define KESBLUETOOTH_BLUEZ_OBJECT_H

#include <bluetooth/remote_object.h>

namespace Bluetooth {

/// What the proxies of all objects of the Bluetooth daemon share (bus name org.bluez on the system
/// bus): their properties, and the question whether the daemon is there.
///
/// CALLS. Each operation of Manager, Adapter, Device, Audio, AudioSink and Control that calls the
/// daemon first forgets the proxy's error. When it fails, the error's text is written to the log
/// and stays in the proxy until the next call: getErrorMessage() tells. An operation that gives
/// nothing back but success or failure is sent without waiting for the daemon: 0 means that the
/// call was handed to the bus, not that the daemon carried it out. The others block until the
/// daemon answers, at most the bus's default time-out (25 s).
///
/// OWNERSHIP. Proxies, lists and dictionaries that an operation returns are new each time, belong
/// to the caller and are deleted by it.
///
/// THREADS. One thread at a time may use a proxy; different proxies may be used by different
/// threads at once. Signal callbacks run on the receive thread that startLoop() began.
class KESBLUETOOTH_API BluezObject : public RemoteObject {
public:
    /// For the daemon's interfaces that have a class of their own, use that.
    /// @param path      object path, e.g. "/org/bluez/1234/hci0"
    /// @param interface interface name, e.g. "org.bluez.Adapter"
    BluezObject(const char* path, const char* interface);
    ~BluezObject() override;

    /// Reads all properties of the object (GetProperties).
    /// @return a new dictionary, deleted by the caller; null on any failure, never a part of it
    ///
    /// Blocks until the daemon answers, at most 25 s.
    virtual Dict* getProperties();

    /// Changes a property (SetProperty), without waiting for the daemon's verdict.
    /// @param name  e.g. "Powered"
    /// @param value must have the property's own type. A text array or a signed integer cannot be
    ///              sent: the call goes out without it, the result is 0, and the error is logged.
    /// @return 0 when the call was handed to the bus, otherwise -1
    int setProperty(const char* name, const Variant& value);

    /// Subscribes to PropertyChanged of this interface.
    /// @param callback called on the receive thread with this proxy, the property's name and its
    ///                 new value; null selects propertyChangedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setPropertyChangedHandler(StringVariantCallback callback);

    /// Default callback. Prints "NAME was changed in PATH with VALUE".
    static void propertyChangedHandler(RemoteObject* sender, const char* name,
                                       const Variant* value);

    /// Tells whether the Bluetooth daemon is on the system bus at this moment. The bus is asked
    /// each time, once, since the daemon may come and go.
    /// @return false also when the bus cannot be asked
    ///
    /// Blocks until the bus answers, at most 25 s.
    static bool hasBluetoothd();
};

} // namespace Bluetooth

#endif
