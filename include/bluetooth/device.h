// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_DEVICE_H
#define KESBLUETOOTH_DEVICE_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote device that the daemon knows (interface org.bluez.Device).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getDevice() or an Adapter and deleted by the caller.
class KESBLUETOOTH_API Device : public BluezObject {
public:
    /// Prefer getDevice(), which reports an absent daemon.
    /// @param path see getDevice()
    explicit Device(const char* path);
    ~Device() override;

    /// Makes the proxy of a device when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Device, deleted by the caller; null when the daemon is not on the bus
    static Device* getDevice(const char* path);

    /// Reads the device's service records from the device itself.
    /// @dbus DiscoverServices(s pattern) -> a{us}
    /// @param pattern which services: a UUID, a short one such as "0x110b", or "" for all
    /// @return a new dictionary, deleted by the caller, of record handle (in decimal) and record
    ///         (an XML string); null on any failure, never a part of it
    ///
    /// Blocks until the daemon replies, at most 25 s.
    Dict* discoverServices(const char* pattern);

    /// Ends a discoverServices() that is under way in another thread.
    /// @dbus CancelDiscovery()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int cancelDiscovery();

    /// Makes the daemon close the device's connection, with all that uses it. DisconnectRequested
    /// comes first; about 2 s later the property "Connected" reports success.
    /// @dbus Disconnect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int disconnect();

    /// Subscribes to DisconnectRequested: the daemon is about to close the device's connection.
    /// @dbus signal DisconnectRequested()
    /// @param callback called on the receive thread with the proxy that runs it, which need not be
    ///                 this one; null selects disconnectRequestedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDisconnectRequestedHandler(NoArgumentCallback callback);

    /// Default callback. Prints "Disconnect requested from PATH".
    static void disconnectRequestedHandler(RemoteObject* sender);
};

} // namespace Bluetooth

#endif
