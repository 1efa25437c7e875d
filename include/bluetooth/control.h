// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CONTROL_H
#define KESBLUETOOTH_CONTROL_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote device's remote control (interface org.bluez.Control).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getControl() and deleted by the caller.
class KESBLUETOOTH_API Control : public BluezObject {
public:
    /// Prefer getControl(), which reports an absent daemon.
    /// @param path see getControl()
    explicit Control(const char* path);
    ~Control() override;

    /// Makes the proxy of a remote control when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Control, deleted by the caller; null when the daemon is not on the bus
    static Control* getControl(const char* path);

    /// Reads whether the remote control is connected.
    /// @dbus IsConnected() -> b
    /// @param connected receives the value; unchanged on failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon replies, at most 25 s.
    int isConnected(bool& connected);

    /// Presses and releases the key that lowers the volume.
    /// @dbus VolumeDown()
    /// @return 0 when the call was handed to the bus, whether or not the device reacts; else -1
    int volumeDown();
    /// Presses and releases the key that raises the volume.
    /// @dbus VolumeUp()
    /// @return as volumeDown()
    int volumeUp();

    /// Subscribes to Connected: the remote control was connected.
    /// @dbus signal Connected()
    /// @param callback called on the receive thread with the proxy that runs it, which need not be
    ///                 this one; null selects the default callback, here connectedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setConnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Disconnected: the remote control was disconnected. Otherwise as
    /// setConnectedHandler().
    /// @dbus signal Disconnected()
    int setDisconnectedHandler(NoArgumentCallback callback);

    /// Default callback. Prints "Connected from PATH".
    static void connectedHandler(RemoteObject* sender);
    /// Default callback. Prints "Disconnected from PATH".
    static void disconnectedHandler(RemoteObject* sender);
};

} // namespace Bluetooth

#endif
