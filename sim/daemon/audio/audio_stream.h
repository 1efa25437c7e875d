// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_AUDIO_STREAM_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_AUDIO_STREAM_H

#include "daemon/audio/audio_profile.h"
#include "serving/bluez4/audio_interfaces.h"

#include <string>

namespace Bluetooth::Sim {

/// A stereo stream: org.bluez.AudioSink to a device that plays, org.bluez.AudioSource from one that
/// is played. They differ in what they signal.
class AudioStream : public AudioProfile {
public:
    enum class Direction { ToSink, FromSource };

    AudioStream(DeviceAudio& audio, Direction direction);

    const Interface& table() const;

    /// Whether a connection can be begun now.
    bool ready() const;
    /// Connects.
    /// @param call  what asks for it, or null when Audio.Connect does
    void begin(const CallPtr& call);
    void peerConnects(const std::string& uuid);
    void peerCloses() { close(); }
    void setPlaying(bool playing);
    /// The stream ends: by the device, with the link, or since all audio does.
    void close();
    /// Gives up what does not stand yet.
    void cancel();
    void abandon();

private:
    template <class Served>
    friend const Interface& Serving::audioSinkInterface();
    template <class Served>
    friend const Interface& Serving::audioSourceInterface();

    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);
    void isConnected(const CallPtr& call);
    void getProperties(const CallPtr& call);

    bool isSink() const { return m_direction == Direction::ToSink; }
    const MediaSide& ourSide() const;
    void sessionUp(bool allowed);
    void open();
    void opened();
    void failed();
    void nobodyThere();
    void answerLater();
    void enter(AudioState state);

    Direction m_direction;
    CallPtr m_connect;        ///< Connect that waits
    CallPtr m_disconnect;     ///< Disconnect that waits
    bool m_settingUp = false; ///< we connect, or the answer about that is still due
    bool m_open = false;
    OneShotTimer m_retry;
};

} // namespace Bluetooth::Sim

#endif
