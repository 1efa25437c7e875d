// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUDIO_ADAPTER_MEDIA_H
#define KESBLUETOOTH_SIM_DAEMON_AUDIO_ADAPTER_MEDIA_H

#include "serving.h"
#include "serving/bluez4/audio_interfaces.h"
#include "serving/bus/bus_connection.h"

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

class MediaTransport;
class ServedAdapter;
class ServedDevice;

/// Our side of a connection, by the service classes for which endpoints are registered.
struct MediaSide {
    const char* uuid;
    const char* olderUuid; ///< the profile's before it, "" for none
    enum class Kind { Stream, Gateway, Headset } kind;
};

namespace MediaSides {

inline constexpr MediaSide streamSource{"110a", "", MediaSide::Kind::Stream};
inline constexpr MediaSide streamSink{"110b", "", MediaSide::Kind::Stream};
inline constexpr MediaSide voiceGateway{"111f", "1112", MediaSide::Kind::Gateway};
inline constexpr MediaSide voiceHeadset{"111e", "1108", MediaSide::Kind::Headset};

} // namespace MediaSides

/// org.bluez.Media of an adapter: the endpoints and players of clients.
class AdapterMedia {
public:
    using Play = std::function<void(bool playing)>;
    using Done = std::function<void(bool configured)>;

    explicit AdapterMedia(ServedAdapter& adapter);
    AdapterMedia(const AdapterMedia&) = delete;
    AdapterMedia& operator=(const AdapterMedia&) = delete;
    ~AdapterMedia();

    /// Lets endpoints for that side configure a device's connection, each with a transport of its
    /// own. Without such endpoints that is done at once: the sound is nobody's.
    /// @param play  starts and stops the stream
    void configure(ServedDevice& device, const MediaSide& side, const Play& play, const Done& done);
    /// The connection has ended: its endpoints are told so.
    void clear(ServedDevice& device, const MediaSide& side);
    /// The same for a device that goes; nobody is told.
    void forget(ServedDevice& device);
    void clientGone(const std::string& client);
    /// The adapter goes.
    void release();

private:
    template <class Served>
    friend const Interface& Serving::mediaInterface();

    /// What a client has registered.
    struct Registered {
        std::string owner;
        std::string path;
    };
    struct Endpoint : Registered {
        std::string uuid;
        MediaSide::Kind kind = MediaSide::Kind::Stream;
        guint8 codec = 0;
        std::map<const ServedDevice*, std::unique_ptr<MediaTransport>> transports;
    };
    using EndpointPtr = std::shared_ptr<Endpoint>;

    void registerEndpoint(const CallPtr& call);
    void unregisterEndpoint(const CallPtr& call);
    void registerPlayer(const CallPtr& call);
    void unregisterPlayer(const CallPtr& call);

    std::vector<EndpointPtr> endpointsFor(const MediaSide& side) const;
    void selectConfiguration(ServedDevice& device, const EndpointPtr& endpoint, const Play& play,
                             const Done& done);
    void setConfiguration(ServedDevice& device, const EndpointPtr& endpoint,
                          const Value& configuration, const Play& play, const Done& done);
    using OnAnswer = std::function<void(const CallResult& answer, const EndpointPtr& there)>;
    /// Asks an endpoint.
    /// @param answered  called with the endpoint, or null when it has gone meanwhile; not called
    ///                  when the device has gone
    void ask(ServedDevice& device, const EndpointPtr& endpoint, const char* member,
             const Value& arguments, OnAnswer answered);

    ServedAdapter& m_adapter;
    std::vector<EndpointPtr> m_endpoints;
    std::vector<std::unique_ptr<Registered>> m_players;
};

} // namespace Bluetooth::Sim

#endif
