// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_AUDIO_PROFILE_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_AUDIO_PROFILE_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bus/one_shot_timer.h"

#include <functional>
#include <string>

namespace Bluetooth::Sim {

class DeviceAudio;
struct MediaSide;

/// How far an audio profile is connected, in the order in which that comes about.
enum class AudioState { Disconnected, Connecting, Connected, Playing };

const char* textOf(AudioState state);

/// One audio profile of a device: its state, its use of the link, and what comes later.
///
/// What an attempt to connect has set going is forgotten when the profile lets go of the link.
class AudioProfile {
public:
    AudioProfile(const AudioProfile&) = delete;
    AudioProfile& operator=(const AudioProfile&) = delete;

    AudioState state() const { return m_state; }
    bool connected() const { return m_state >= AudioState::Connected; }
    bool disconnected() const { return m_state == AudioState::Disconnected; }

protected:
    /// @param interface  the one that says what happens
    AudioProfile(DeviceAudio& audio, const char* interface)
        : m_audio(audio), m_interface(interface) {}
    ~AudioProfile() = default;

    void emit(const char* member, const Value& arguments = {});
    void changed(const char* property, const Value& value);
    /// Emits the state too, also when it is what it was.
    void setState(AudioState state);

    /// Takes the link, and reaches the device.
    /// @param failed  when it does not answer, or hangs
    void reach(const std::function<void()>& reached, const std::function<void()>& failed);
    /// Takes the link that the device brings up by connecting to us.
    void accept();
    /// Asks whether the device may use a service.
    /// @param wanted  whether we have connected to it as well
    void authorize(const std::string& uuid, bool wanted, std::function<void(bool)> done);
    /// Asks the same for a device that connects to us, and sets the profile up.
    void admit(const std::string& uuid, std::function<void()> opened,
               std::function<void()> refused);
    /// Lets clients' endpoints configure the stream.
    void configure(const MediaSide& side, const std::function<void(bool)>& play,
                   std::function<void(bool)> done);
    /// Something happens later, instead of what was set before.
    void later(guint Times::*time, std::function<void()> action);
    void letGo(guint Times::*idle = &Times::audioIdle);
    /// Stops without a word; the device has gone.
    void abandon();

    /// Makes an action one of the present attempt only.
    std::function<void(bool)> ofThisAttempt(std::function<void(bool)> action);

    DeviceAudio& m_audio;

private:
    const char* m_interface;
    AudioState m_state = AudioState::Disconnected;
    unsigned m_attempt = 0;
    unsigned m_paging = 0;
    Link::Hold m_hold;
    OneShotTimer m_timer;
};

} // namespace Bluetooth::Sim

#endif
