#ifndef KESBLUETOOTH_AUDIO_SINK_H
#define KESBLUETOOTH_AUDIO_SINK_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

/// The proxy of one remote device's stereo sink, e.g. a headset (interface org.bluez.AudioSink).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAudioSink() and deleted by the caller.
class KESBLUETOOTH_API AudioSink : public BluezObject {
public:
    /// Prefer getAudioSink(), which tells when the daemon is absent.
    explicit AudioSink(const char* path);
    ~AudioSink() override;

    /// @param path the device's, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new AudioSink, deleted by the caller; null when the daemon is not on the bus
    static AudioSink* getAudioSink(const char* path);

    /// Asks the daemon to connect (Connect) or disconnect (Disconnect) the sink. The signals
    /// Connected and Disconnected tell when it happened.
    /// @return 0 when the call was handed to the bus, otherwise -1
    int connect();
    int disconnect();

    /// Asks whether the sink is connected (IsConnected).
    /// @param connected receives the answer; unchanged on failure
    /// @return 0, or -1 on any failure
    /// Blocks until the daemon answers, at most 25 s.
    int isConnected(bool& connected);

    /// Each subscribes to the signal of its name: the sink was connected or disconnected, audio
    /// began or ceased to flow.
    /// @param callback gets the proxy that runs the loop, which need not be this one; null selects
    ///                 the default callback below
    /// @return 0, or -1 when the bus refuses (logged)
    int setConnectedHandler(NoArgumentCallback callback);
    int setDisconnectedHandler(NoArgumentCallback callback);
    int setPlayingHandler(NoArgumentCallback callback);
    int setStoppedHandler(NoArgumentCallback callback);

    /// Default callbacks. They print "Connected from PATH", "Disconnected from PATH", "Playing in
    /// PATH" and "Stopped in PATH".
    static void connectedHandler(RemoteObject* sender);
    static void disconnectedHandler(RemoteObject* sender);
    static void playingHandler(RemoteObject* sender);
    static void stoppedHandler(RemoteObject* sender);
};

} // namespace Bluetooth

#endif
