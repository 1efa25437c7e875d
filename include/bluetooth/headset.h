// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HEADSET_H
#define KESBLUETOOTH_HEADSET_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote device's headset or hands-free unit (interface org.bluez.Headset), which
/// carries calls; for music see AudioSink.
///
/// The properties "SpeakerGain" and "MicrophoneGain" are there only while it is connected, and can
/// be changed by setProperty() too. Their changes come as PropertyChanged.
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getHeadset() and deleted by the caller.
class KESBLUETOOTH_API Headset : public BluezObject {
public:
    /// Prefer getHeadset(), which reports an absent daemon.
    /// @param path see getHeadset()
    explicit Headset(const char* path);
    ~Headset() override;

    /// Makes the proxy of a device's headset when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Headset, deleted by the caller; null when the daemon is not on the bus
    static Headset* getHeadset(const char* path);

    /// Makes the daemon connect the headset. The signal Connected reports success.
    /// @dbus Connect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Makes the daemon disconnect it. The signal Disconnected reports success.
    /// @dbus Disconnect()
    /// @return as connect()
    int disconnect();

    /// Reads whether the headset is connected.
    /// @dbus IsConnected() -> b
    /// @param connected receives the value; unchanged on failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon replies, at most 25 s.
    int isConnected(bool& connected);

    /// Makes the headset ring, about every 3 s, until cancelCall().
    /// @dbus IndicateCall()
    /// @return as connect()
    int indicateCall();
    /// Ends the ringing.
    /// @dbus CancelCall()
    /// @return as connect()
    int cancelCall();

    /// Opens the audio connection. The signal Playing reports success. BlueZ 4.101 refuses where
    /// its audio.conf routes SCO by HCI, as the one that it is shipped with does.
    /// @dbus Play()
    /// @return as connect()
    int play();
    /// Closes the audio connection. The signal Stopped reports success.
    /// @dbus Stop()
    /// @return as connect()
    int stop();

    /// Reads whether the audio connection is open.
    /// @dbus IsPlaying() -> b
    /// @param playing receives the value; unchanged on failure
    /// @return as isConnected()
    int isPlaying(bool& playing);

    /// Reads the speaker's gain.
    /// @dbus GetSpeakerGain() -> q
    /// @param gain receives it, from 0 to 15; unchanged on failure
    /// @return as isConnected(); -1 also while the headset is not connected
    int getSpeakerGain(unsigned short& gain);
    /// Reads the microphone's gain. Otherwise as getSpeakerGain().
    /// @dbus GetMicrophoneGain() -> q
    int getMicrophoneGain(unsigned short& gain);
    /// Changes the speaker's gain. The daemon refuses the gain that it already has.
    /// @dbus SetSpeakerGain(q gain)
    /// @param gain from 0 to 15
    /// @return as connect()
    int setSpeakerGain(unsigned short gain);
    /// Changes the microphone's gain. Otherwise as setSpeakerGain().
    /// @dbus SetMicrophoneGain(q gain)
    int setMicrophoneGain(unsigned short gain);

    /// Subscribes to Connected: the headset was connected.
    /// @dbus signal Connected()
    /// @param callback called on the receive thread with the proxy that runs it, which need not be
    ///                 this one; null selects the default callback, here connectedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setConnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Disconnected: the headset was disconnected. Otherwise as
    /// setConnectedHandler().
    /// @dbus signal Disconnected()
    int setDisconnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Playing: the audio connection was opened. Otherwise as setConnectedHandler().
    /// @dbus signal Playing()
    int setPlayingHandler(NoArgumentCallback callback);
    /// Subscribes to Stopped: the audio connection was closed. Otherwise as setConnectedHandler().
    /// @dbus signal Stopped()
    int setStoppedHandler(NoArgumentCallback callback);
    /// Subscribes to AnswerRequested: the headset's answer button was pressed. Otherwise as
    /// setConnectedHandler().
    /// @dbus signal AnswerRequested()
    int setAnswerRequestedHandler(NoArgumentCallback callback);
    /// Subscribes to CallTerminated: the headset ended the call. Otherwise as
    /// setConnectedHandler().
    /// @dbus signal CallTerminated()
    int setCallTerminatedHandler(NoArgumentCallback callback);

    /// Default callback. Prints "Connected from PATH".
    static void connectedHandler(RemoteObject* sender);
    /// Default callback. Prints "Disconnected from PATH".
    static void disconnectedHandler(RemoteObject* sender);
    /// Default callback. Prints "Playing in PATH".
    static void playingHandler(RemoteObject* sender);
    /// Default callback. Prints "Stopped in PATH".
    static void stoppedHandler(RemoteObject* sender);
    /// Default callback. Prints "Answer requested from PATH".
    static void answerRequestedHandler(RemoteObject* sender);
    /// Default callback. Prints "Call terminated from PATH".
    static void callTerminatedHandler(RemoteObject* sender);
};

} // namespace Bluetooth

#endif
