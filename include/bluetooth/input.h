// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_INPUT_H
#define KESBLUETOOTH_INPUT_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote keyboard, mouse or other input device (interface org.bluez.Input). The
/// daemon has it for devices with the HID service, and for headsets with buttons.
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getInput() and deleted by the caller.
class KESBLUETOOTH_API Input : public BluezObject {
public:
    /// Prefer getInput(), which reports an absent daemon.
    /// @param path see getInput()
    explicit Input(const char* path);
    ~Input() override;

    /// Makes the proxy of an input device when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Input, deleted by the caller; null when the daemon is not on the bus
    static Input* getInput(const char* path);

    /// Makes the daemon connect the device. The property "Connected" reports success.
    /// @dbus Connect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Makes the daemon disconnect it, or end a connect() that is under way.
    /// @dbus Disconnect()
    /// @return as connect()
    int disconnect();
};

} // namespace Bluetooth

#endif
