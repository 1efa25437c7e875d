// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_MEDIA_TRANSPORT_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_MEDIA_TRANSPORT_H

#include "daemon/audio/adapter_media.h"
#include "daemon/audio/media_socket.h"
#include "serving.h"
#include "serving/bluez4/audio_interfaces.h"

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// org.bluez.MediaTransport: the way of the sound, between a client and a device. The stream runs
/// as long as a client has acquired it.
class MediaTransport {
public:
    struct Format {
        std::string uuid; ///< of the endpoint, as that has written it
        guint8 codec;
        Value configuration;
        MediaSide::Kind kind;
    };

    /// @param play  starts and stops the stream
    MediaTransport(ServedDevice& device, Format format, std::function<void(bool)> play);
    MediaTransport(const MediaTransport&) = delete;
    MediaTransport& operator=(const MediaTransport&) = delete;
    ~MediaTransport();

    const std::string& path() const { return m_path; }
    Value properties() const;
    void clientGone(const std::string& client) { drop(client); }
    /// Nothing is started or stopped any more.
    void abandon() { m_owners.clear(); }

private:
    template <class Served>
    friend const Interface& Serving::mediaTransportInterface();

    void getProperties(const CallPtr& call);
    void acquire(const CallPtr& call);
    void release(const CallPtr& call);
    void setProperty(const CallPtr& call);
    void setDelay(const CallPtr& call, const Value& value);
    void setVolume(const CallPtr& call, const Value& value);

    bool held(char access) const;
    void drop(const std::string& owner);

    ServedDevice& m_device;
    Format m_format;
    std::function<void(bool)> m_play;
    std::string m_path;
    guint16 m_delay = 0;
    std::optional<guint16> m_volume;
    std::map<std::string, std::string> m_owners; ///< "r", "w" or "rw" by client
    std::unique_ptr<MediaSocket> m_socket;
};

} // namespace Bluetooth::Sim

#endif
