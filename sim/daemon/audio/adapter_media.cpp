// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/audio/adapter_media.h"

#include "daemon/audio/media_transport.h"
#include "daemon/bluetoothd.h"
#include "daemon/served_adapter.h"
#include "daemon/served_device.h"
#include "serving/bluez4/errors.h"
#include "world/settings.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace Bluetooth::Sim {

namespace {

constexpr guint8 sbc = 0; // the codec of the simulated devices
constexpr guint8 sbcCapabilities[] = {0xff, 0xff, 2, 64};
constexpr guint requestTimeout = 3000;

const MediaSide* const sides[] = {&MediaSides::streamSource, &MediaSides::streamSink,
                                  &MediaSides::voiceGateway, &MediaSides::voiceHeadset};

Value bytes(const guint8* first, gsize count) {
    return g_variant_new_fixed_array(G_VARIANT_TYPE_BYTE, first, count, sizeof *first);
}

bool isOf(const MediaSide& side, const std::string& uuid) {
    const std::string full = fullUuid(uuid);
    return !full.empty() && (full == fullUuid(side.uuid) || full == fullUuid(side.olderUuid));
}

/// Calls something for each entry of an a{sv}, until it returns false.
template <class Entry>
bool forEach(const Value& dict, const Entry& entry) {
    GVariantIter entries;
    g_variant_iter_init(&entries, dict.get());
    const char* key = nullptr;
    GVariant* value = nullptr;
    while (g_variant_iter_next(&entries, "{&sv}", &key, &value)) {
        const GlibPtr<GVariant> owned(value);
        if (!entry(key, Value(value)))
            return false;
    }
    return true;
}

bool isKey(const char* key, const char* name) {
    return g_ascii_strcasecmp(key, name) == 0;
}

/// What a player says of itself, or of its track: names, types, and where they are few, values.
struct PlayerKey {
    const char* name;
    const char* type;
    std::vector<const char*> values;
};

bool areValid(const Value& dict, const std::vector<PlayerKey>& keys) {
    return forEach(dict, [&](const char* key, const Value& value) {
        const auto known = std::find_if(keys.begin(), keys.end(),
                                        [&](const auto& k) { return isKey(key, k.name); });
        if (known == keys.end() || !value.is(known->type))
            return false;
        const auto& values = known->values;
        return values.empty() || std::any_of(values.begin(), values.end(), [&](const char* v) {
                   return isKey(value.text().c_str(), v);
               });
    });
}

const std::vector<PlayerKey>& playerKeys() {
    static const std::vector<PlayerKey> keys = {
        {"Equalizer", "s", {"off", "on"}},
        {"Repeat", "s", {"off", "singletrack", "alltracks", "group"}},
        {"Shuffle", "s", {"off", "alltracks", "group"}},
        {"Scan", "s", {"off", "alltracks", "group"}},
        {"Status", "s", {"playing", "stopped", "paused", "forward-seek", "reverse-seek", "error"}},
        {"Position", "u", {}}};
    return keys;
}

const std::vector<PlayerKey>& trackKeys() {
    static const std::vector<PlayerKey> keys = {
        {"Title", "s", {}},          {"Artist", "s", {}}, {"Album", "s", {}},   {"Genre", "s", {}},
        {"NumberOfTracks", "u", {}}, {"Number", "u", {}}, {"Duration", "u", {}}};
    return keys;
}

/// What a call's sender has registered at the path that it names, or the list's end.
template <class List>
auto findOf(List& list, const CallPtr& call) {
    return std::find_if(list.begin(), list.end(), [&](const auto& entry) {
        return entry->owner == call->sender() && entry->path == call->text(0);
    });
}

} // namespace

AdapterMedia::AdapterMedia(ServedAdapter& adapter) : m_adapter(adapter) {
    m_adapter.daemon().objects().add(m_adapter.path(), mediaInterface<AdapterMedia>(), this);
}

AdapterMedia::~AdapterMedia() = default;

void AdapterMedia::registerEndpoint(const CallPtr& call) {
    if (findOf(m_endpoints, call) != m_endpoints.end())
        return call->fail(Errors::alreadyExists);
    auto endpoint = std::make_shared<Endpoint>();
    endpoint->owner = call->sender();
    endpoint->path = call->text(0);
    bool hasCodec = false;
    const bool valid = forEach(call->argument(1), [&](const char* key, const Value& value) {
        if (isKey(key, "UUID") && value.is("s"))
            endpoint->uuid = value.text();
        else if (isKey(key, "Codec") && value.is("y"))
            endpoint->codec = g_variant_get_byte(value.get()), hasCodec = true;
        else if (isKey(key, "UUID") || isKey(key, "Codec") ||
                 (isKey(key, "DelayReporting") && !value.is("b")) ||
                 (isKey(key, "Capabilities") && !value.is("a*")))
            return false;
        return true;
    });
    const auto* side = std::find_if(std::begin(sides), std::end(sides),
                                    [&](const auto* s) { return isOf(*s, endpoint->uuid); });
    if (!valid || !hasCodec || side == std::end(sides))
        return call->fail(Errors::invalidArguments);
    if (*side == &MediaSides::streamSink && !m_adapter.daemon().world().audio.source)
        return call->fail(Errors::notSupported);
    endpoint->kind = (*side)->kind;
    m_endpoints.push_back(std::move(endpoint));
    call->reply();
}

void AdapterMedia::unregisterEndpoint(const CallPtr& call) {
    const auto found = findOf(m_endpoints, call);
    if (found == m_endpoints.end())
        return call->fail(Errors::doesNotExist);
    m_endpoints.erase(found);
    call->reply();
}

void AdapterMedia::registerPlayer(const CallPtr& call) {
    if (findOf(m_players, call) != m_players.end())
        return call->fail(Errors::alreadyExists);
    if (!areValid(call->argument(1), playerKeys()) || !areValid(call->argument(2), trackKeys()))
        return call->fail(Errors::invalidArguments);
    m_players.push_back(std::make_unique<Registered>(Registered{call->sender(), call->text(0)}));
    call->reply();
}

void AdapterMedia::unregisterPlayer(const CallPtr& call) {
    const auto found = findOf(m_players, call);
    if (found == m_players.end())
        return call->fail(Errors::doesNotExist);
    m_adapter.daemon().bus().send((*found)->owner, (*found)->path, Interfaces::mediaPlayer,
                                  "Release");
    m_players.erase(found);
    call->reply();
}

std::vector<AdapterMedia::EndpointPtr> AdapterMedia::endpointsFor(const MediaSide& side) const {
    std::vector<EndpointPtr> found;
    for (const EndpointPtr& endpoint : m_endpoints)
        if (isOf(side, endpoint->uuid))
            found.push_back(endpoint);
    return found;
}

void AdapterMedia::configure(ServedDevice& device, const MediaSide& side, const Play& play,
                             const Done& done) {
    const auto endpoints = endpointsFor(side);
    if (side.kind != MediaSide::Kind::Stream) {
        // Each gets a transport, and each may refuse.
        for (const EndpointPtr& endpoint : endpoints)
            setConfiguration(device, endpoint, bytes(nullptr, 0), play, done);
        return;
    }
    const auto usable = std::find_if(endpoints.begin(), endpoints.end(),
                                     [](const auto& endpoint) { return endpoint->codec == sbc; });
    if (usable == endpoints.end())
        return done(true);
    selectConfiguration(device, *usable, play, done);
}

void AdapterMedia::selectConfiguration(ServedDevice& device, const EndpointPtr& endpoint,
                                       const Play& play, const Done& done) {
    endpoint->transports[&device] = nullptr; // until it is known how it is to be
    ask(device, endpoint, "SelectConfiguration",
        tuple(bytes(sbcCapabilities, sizeof sbcCapabilities)),
        [this, &device, play, done](const CallResult& answer, const EndpointPtr& there) {
            // Meanwhile the attempt may have been given up.
            if (!there || there->transports.count(&device) == 0)
                return done(false);
            there->transports.erase(&device);
            if (answer.failed || !answer.results.is("(ay)"))
                return done(false);
            const GlibPtr<GVariant> chosen(g_variant_get_child_value(answer.results.get(), 0));
            setConfiguration(device, there, Value(chosen.get()), play, done);
        });
}

void AdapterMedia::setConfiguration(ServedDevice& device, const EndpointPtr& endpoint,
                                    const Value& configuration, const Play& play,
                                    const Done& done) {
    const MediaTransport& transport = *(
        endpoint->transports[&device] = std::make_unique<MediaTransport>(
            device,
            MediaTransport::Format{endpoint->uuid, endpoint->codec, configuration, endpoint->kind},
            play));
    ask(device, endpoint, "SetConfiguration",
        tuple(pathValue(transport.path()), transport.properties()),
        [&device, done](const CallResult& answer, const EndpointPtr& there) {
            if (there && answer.failed)
                there->transports.erase(&device);
            done(there && !answer.failed);
        });
}

void AdapterMedia::ask(ServedDevice& device, const EndpointPtr& endpoint, const char* member,
                       const Value& arguments, OnAnswer answered) {
    m_adapter.daemon().bus().call(endpoint->owner, endpoint->path, Interfaces::mediaEndpoint,
                                  member, arguments, requestTimeout, nullptr,
                                  [alive = device.weak_from_this(),
                                   there = std::weak_ptr<Endpoint>(endpoint),
                                   answered = std::move(answered)](const CallResult& answer) {
                                      if (!alive.expired())
                                          answered(answer, there.lock());
                                  });
}

void AdapterMedia::clear(ServedDevice& device, const MediaSide& side) {
    for (const EndpointPtr& endpoint : endpointsFor(side)) {
        const auto transport = endpoint->transports.find(&device);
        if (transport == endpoint->transports.end())
            continue;
        if (transport->second)
            m_adapter.daemon().bus().send(endpoint->owner, endpoint->path,
                                          Interfaces::mediaEndpoint, "ClearConfiguration",
                                          tuple(pathValue(transport->second->path())));
        endpoint->transports.erase(transport);
    }
}

void AdapterMedia::forget(ServedDevice& device) {
    for (const EndpointPtr& endpoint : m_endpoints)
        if (const auto transport = endpoint->transports.find(&device);
            transport != endpoint->transports.end()) {
            if (transport->second)
                transport->second->abandon();
            endpoint->transports.erase(transport);
        }
}

void AdapterMedia::clientGone(const std::string& client) {
    const auto isGone = [&](const auto& entry) { return entry->owner == client; };
    m_players.erase(std::remove_if(m_players.begin(), m_players.end(), isGone), m_players.end());
    const auto endpoints = m_endpoints;
    for (const EndpointPtr& endpoint : endpoints) {
        for (const auto& [device, transport] : endpoint->transports)
            if (transport)
                transport->clientGone(client);
        if (isGone(endpoint))
            m_endpoints.erase(std::find(m_endpoints.begin(), m_endpoints.end(), endpoint));
    }
}

void AdapterMedia::release() {
    BusConnection& bus = m_adapter.daemon().bus();
    for (const EndpointPtr& endpoint : std::exchange(m_endpoints, {})) {
        for (const auto& [device, transport] : endpoint->transports)
            if (transport)
                transport->abandon();
        bus.send(endpoint->owner, endpoint->path, Interfaces::mediaEndpoint, "Release");
    }
    for (const auto& player : std::exchange(m_players, {}))
        bus.send(player->owner, player->path, Interfaces::mediaPlayer, "Release");
}

} // namespace Bluetooth::Sim
