// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_AUDIO_SOURCE_H
#define KESBLUETOOTH_AUDIO_SOURCE_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote device that sends stereo audio to this host, such as a phone (interface
/// org.bluez.AudioSource). Its one signal is PropertyChanged, its one property "State".
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAudioSource() and deleted by the caller.
class KESBLUETOOTH_API AudioSource : public BluezObject {
public:
    /// Prefer getAudioSource(), which reports an absent daemon.
    /// @param path see getAudioSource()
    explicit AudioSource(const char* path);
    ~AudioSource() override;

    /// Makes the proxy of a device's stereo source when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new AudioSource, deleted by the caller; null when the daemon is not on the bus
    static AudioSource* getAudioSource(const char* path);

    /// Makes the daemon connect the source. The property "State" reports the result.
    /// @dbus Connect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Makes the daemon disconnect it. The property "State" reports the result.
    /// @dbus Disconnect()
    /// @return as connect()
    int disconnect();
};

} // namespace Bluetooth

#endif
