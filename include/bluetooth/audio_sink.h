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
    /// Prefer getAudioSink(), which tells when the daemon is absent.
    explicit AudioSink(const char* path);
    ~AudioSink() override;

    /// Makes the proxy of a device's stereo sink when the daemon is there (ListNames of the bus).
    /// @param path the device's, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new AudioSink, deleted by the caller; null when the daemon is not on the bus
    static AudioSink* getAudioSink(const char* path);

    /// Asks the daemon to connect the sink (Connect). The signal Connected tells when it happened.
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    /// Asks the daemon to disconnect it (Disconnect). The signal Disconnected tells when it
    /// happened. @return as connect()
    int disconnect();

    /// Asks whether the sink is connected (IsConnected).
    /// @param connected receives the answer; unchanged on failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon answers, at most 25 s.
    int isConnected(bool& connected);

    /// Subscribes to Connected: the sink was connected.
    /// @param callback gets the proxy that runs the loop, which need not be this one; null selects
    ///                 the default callback, here connectedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setConnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Disconnected: the sink was disconnected. Otherwise as setConnectedHandler().
    int setDisconnectedHandler(NoArgumentCallback callback);
    /// Subscribes to Playing: audio began to flow. Otherwise as setConnectedHandler().
    int setPlayingHandler(NoArgumentCallback callback);
    /// Subscribes to Stopped: audio ceased to flow. Otherwise as setConnectedHandler().
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
