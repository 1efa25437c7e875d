// SPDX-License-Identifier: LGPL-2.1-or-later
#include "service.h"

#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/input.h>

#include <algorithm>

namespace AutoConnectd {

namespace {

using Uuids = std::initializer_list<const char*>;

constexpr Uuids sink = {"0000110b-"};
constexpr Uuids headset = {"00001108-", "0000111e-"}; // what Audio.Connect reaches but a sink
constexpr Uuids input = {"00001124-"};

template <class Proxy>
std::unique_ptr<Bluetooth::BluezObject> makeProxy(const char* path) {
    return std::make_unique<Proxy>(path);
}

constexpr Service sinkService{"audio", "Connected", "1", makeProxy<Bluetooth::AudioSink>};
constexpr Service audioService{"audio", "State", "connected", makeProxy<Bluetooth::Audio>};
constexpr Service inputService{"input", "Connected", "1", makeProxy<Bluetooth::Input>};

bool hasAny(const std::string& uuids, Uuids wanted) {
    return std::any_of(wanted.begin(), wanted.end(),
                       [&](const char* uuid) { return uuids.find(uuid) != std::string::npos; });
}

} // namespace

std::vector<const Service*> servicesOf(const std::string& uuids) {
    std::vector<const Service*> services;
    if (hasAny(uuids, sink))
        services.push_back(&sinkService);
    else if (hasAny(uuids, headset))
        services.push_back(&audioService);
    if (hasAny(uuids, input))
        services.push_back(&inputService);
    return services;
}

} // namespace AutoConnectd
