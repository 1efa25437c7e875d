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
    /// Prefer getControl(), which tells when the daemon is absent.
    explicit Control(const char* path);
    ~Control() override;

    /// Makes the proxy of a remote control when the daemon is there (ListNames of the bus).
    /// @param path the device's, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Control, deleted by the caller; null when the daemon is not on the bus
    static Control* getControl(const char* path);

    /// Asks whether the remote control is connected (IsConnected).
    /// @param connected receives the answer; unchanged on failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon answers, at most 25 s.
    int isConnected(bool& connected);

    /// Presses and releases the key that lowers the volume (VolumeDown).
    /// @return 0 when the call was handed to the bus, whether or not the device reacts; else -1
    int volumeDown();
    /// Presses and releases the key that raises the volume (VolumeUp). @return as volumeDown()
    int volumeUp();

    /// Subscribes to Connected: the remote control was connected.
    /// @param callback gets the proxy that runs the loop, which need not be this one; null selects
    ///                 the default callback, here connectedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setConnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Disconnected: the remote control was disconnected. Otherwise as
    /// setConnectedHandler().
    int setDisconnectedHandler(NoArgumentCallback callback);

    /// Default callback. Prints "Connected from PATH".
    static void connectedHandler(RemoteObject* sender);
    /// Default callback. Prints "Disconnected from PATH".
    static void disconnectedHandler(RemoteObject* sender);
};

} // namespace Bluetooth

#endif
