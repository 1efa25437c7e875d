// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_HEADSET_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_HEADSET_H

#include "daemon/audio/audio_profile.h"
#include "serving/bluez4/audio_interfaces.h"

#include <string>

namespace Bluetooth::Sim {

/// org.bluez.Headset: a device that we give the sound of calls to.
class Headset : public AudioProfile {
public:
    explicit Headset(DeviceAudio& audio);

    /// Whether the device has connected, not we.
    bool byPeer() const { return m_byPeer; }
    /// Connects.
    /// @param call  what asks for it, or null when Audio.Connect does
    void begin(const CallPtr& call);
    void peerConnects(const std::string& uuid);
    void peerCloses() { close(&Times::audioIdleAtPeer); }
    void setPlaying(bool playing);
    /// Its button is pressed.
    void press() { emit("AnswerRequested"); }
    /// @param name  SpeakerGain or MicrophoneGain
    /// @return false, with nothing changed, for another name, the value that it has, or over 15
    bool setGain(const std::string& name, guint16 gain);
    /// The connection ends, or is given up.
    void close(guint Times::*idle = &Times::audioIdle);
    using AudioProfile::abandon;

private:
    template <class Served>
    friend const Interface& Serving::headsetInterface();

    void connect(const CallPtr& call);
    void disconnect(const CallPtr& call);
    void isConnected(const CallPtr& call);
    void indicateCall(const CallPtr& call);
    void play(const CallPtr& call);
    void stop(const CallPtr& call);
    void isPlaying(const CallPtr& call);
    void getSpeakerGain(const CallPtr& call);
    void getMicrophoneGain(const CallPtr& call);
    void setSpeakerGain(const CallPtr& call);
    void setMicrophoneGain(const CallPtr& call);
    void getProperties(const CallPtr& call);
    void setProperty(const CallPtr& call);

    void answerGain(const CallPtr& call, guint16 gain);
    void changeGain(const CallPtr& call, const std::string& name, const Value& gain);
    void enter(AudioState state);
    void opened();

    bool m_byPeer = false;
    guint16 m_speakerGain = 15;
    guint16 m_microphoneGain = 15;
    CallPtr m_connect; ///< Connect that waits
};

} // namespace Bluetooth::Sim

#endif
