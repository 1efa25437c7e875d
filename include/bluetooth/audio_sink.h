// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_AUDIO_SINK_H
#define KESBLUETOOTH_AUDIO_SINK_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote device's stereo sink, such as a headset (interface
/// org.bluez.AudioSink).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAudioSink() and deleted by the caller.
class KESBLUETOOTH_API AudioSink : public BluezObject {
public:
    /// Prefer getAudioSink(), which reports an absent daemon.
    /// @param path see getAudioSink()
    explicit AudioSink(const char* path);
    ~AudioSink() override;

    /// Makes the proxy of a device's stereo sink when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new AudioSink, deleted by the caller; null when the daemon is not on the bus
    static AudioSink* getAudioSink(const char* path);

    /// Makes the daemon connect the sink. The signal Connected reports success.
    /// @dbus Connect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Makes the daemon disconnect it. The signal Disconnected reports success.
    /// @dbus Disconnect()
    /// @return as connect()
    int disconnect();

    /// Reads whether the sink is connected.
    /// @dbus IsConnected() -> b
    /// @param connected receives the value; unchanged on failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon replies, at most 25 s.
    int isConnected(bool& connected);

    /// Subscribes to Connected: the sink was connected.
    /// @dbus signal Connected()
    /// @param callback called on the receive thread with the proxy that runs it, which need not be
    ///                 this one; null selects the default callback, here connectedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setConnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Disconnected: the sink was disconnected. Otherwise as setConnectedHandler().
    /// @dbus signal Disconnected()
    int setDisconnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Playing: audio started. Otherwise as setConnectedHandler().
    /// @dbus signal Playing()
    int setPlayingHandler(NoArgumentCallback callback);
    /// Subscribes to Stopped: audio stopped. Otherwise as setConnectedHandler().
    /// @dbus signal Stopped()
    int setStoppedHandler(NoArgumentCallback callback);

    /// Default callback. Prints "Connected from PATH".
    static void connectedHandler(RemoteObject* sender);
    /// Default callback. Prints "Disconnected from PATH".
    static void disconnectedHandler(RemoteObject* sender);
    /// Default callback. Prints "Playing in PATH".
    static void playingHandler(RemoteObject* sender);
    /// Default callback. Prints "Stopped in PATH".
    static void stoppedHandler(RemoteObject* sender);
};

} // namespace Bluetooth

#endif
