// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_AUDIO_H
#define KESBLUETOOTH_AUDIO_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of all audio profiles of one remote device together (interface org.bluez.Audio).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAudio() and deleted by the caller.
class KESBLUETOOTH_API Audio : public BluezObject {
public:
    /// Prefer getAudio(), which reports an absent daemon.
    /// @param path see getAudio()
    explicit Audio(const char* path);
    ~Audio() override;

    /// Makes the proxy of a device's audio when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Audio, deleted by the caller; null when the daemon is not on the bus
    static Audio* getAudio(const char* path);

    /// Makes the daemon connect all audio profiles that the device has. The property "State"
    /// reports the result.
    /// @dbus Connect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Makes the daemon disconnect them.
    /// @dbus Disconnect()
    /// @return as connect()
    int disconnect();
};

} // namespace Bluetooth

#endif
