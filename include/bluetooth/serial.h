// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERIAL_H
#define KESBLUETOOTH_SERIAL_H

#include <bluetooth/bluez_object.h>

#include <string>

namespace Bluetooth {

/// The proxy of one remote device's serial ports (interface org.bluez.Serial). It has neither
/// properties nor signals.
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getSerial() and deleted by the caller.
class KESBLUETOOTH_API Serial : public BluezObject {
public:
    /// Prefer getSerial(), which reports an absent daemon.
    /// @param path see getSerial()
    explicit Serial(const char* path);
    ~Serial() override;

    /// Makes the proxy of a device's serial ports when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Serial, deleted by the caller; null when the daemon is not on the bus
    static Serial* getSerial(const char* path);

    /// Connects to a serial port of the device and makes a terminal for it. The terminal lasts
    /// until disconnect(), or until this process leaves the bus.
    /// @dbus Connect(s pattern) -> s
    /// @param pattern  which port: a UUID, a short name such as "spp" or "dun", or a channel of
    ///                 RFCOMM from "1" to "30"
    /// @param terminal receives the terminal's file, e.g. "/dev/rfcomm0"; unchanged on failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon replies, at most 25 s. The daemon may still succeed after that:
    /// disconnect() with the same pattern ends the attempt.
    int connect(const char* pattern, std::string& terminal);
    /// Makes the daemon remove a terminal, or end a connect() that is under way.
    /// @dbus Disconnect(s device)
    /// @param terminal the terminal's file that connect() gave, or connect()'s pattern
    /// @return 0 when the call was handed to the bus, otherwise -1
    int disconnect(const char* terminal);
};

} // namespace Bluetooth

#endif
