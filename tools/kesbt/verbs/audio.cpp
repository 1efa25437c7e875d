// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/profile.h"
#include "verbs/list.h"

#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>
#include <bluetooth/headset.h>

#include <array>

namespace Kesbt {

namespace {

using namespace std::string_literals;
using Bluetooth::Audio;

Profile<Audio> openAudio(const Options& options, const std::string& address) {
    return {options, address, Audio::getAudio, "audio"};
}

/// The profiles that audio consists of. Null for one that the device does not have.
struct Part {
    const char* name;
    std::unique_ptr<Bluetooth::BluezObject> proxy;
    Json properties;

    Part(const char* called, Bluetooth::BluezObject* created)
        : name(called), proxy(made(created)), properties(readOptional(*proxy)) {}
};

std::array<Part, 3> partsOf(const Bluetooth::Device& device) {
    const char* path = device.getPath();
    return {Part("sink", Bluetooth::AudioSink::getAudioSink(path)),
            Part("headset", Bluetooth::Headset::getHeadset(path)),
            Part("control", Bluetooth::Control::getControl(path))};
}

void printStatus(const Options& options, const Profile<Audio>& audio, const std::string& address) {
    Json document = {{"address", address},
                     {"adapter", adapterName(*audio.device)},
                     {"audio", readProperties(*audio.proxy)}};
    for (const Part& part : partsOf(*audio.device))
        document[part.name] = part.properties;
    if (options.json) {
        printDocument(document);
        return;
    }
    const auto part = [&](const char* name) {
        return document[name].is_null() ? Json("none") : document[name];
    };
    printProperties({{"Audio", part("audio")},
                     {"Sink", part("sink")},
                     {"Headset", part("headset")},
                     {"Remote control", part("control")}});
}

void connect(const Options& options, const std::string& address) {
    const auto audio = openAudio(options, address);
    setConnected(options, *audio.proxy, address, true);
    // Audio counts as connected by any of its profiles alone. A remote control comes by itself,
    // with the sink or some seconds later.
    for (const Part& part : partsOf(*audio.device)) {
        if (!part.properties.is_null() && part.name != std::string("control"))
            setConnected(options, *part.proxy, "the "s + part.name + " of " + address, true);
    }
    printStatus(options, audio, address);
}

void disconnect(const Options& options, const std::string& address) {
    const auto audio = openAudio(options, address);
    setConnected(options, *audio.proxy, address, false);
    printStatus(options, audio, address);
}

void showStatus(const Options& options, const std::string& address) {
    printStatus(options, openAudio(options, address), address);
}

} // namespace

const Verb audioVerb = {
    "audio",
    "Audio",
    "Connect or disconnect a headset, or show its state",
    "kesbt audio connect 00:11:22:33:44:55\n"
    "kesbt audio status 00:11:22:33:44:55 --json\n"
    "kesbt audio disconnect 00:11:22:33:44:55",
    {{"connect", "Connect all audio profiles of a known device", Limit::Steps,
      oneDevice(connect, knownDevices)},
     {"disconnect", "Disconnect them", Limit::Steps, oneDevice(disconnect, knownDevices)},
     {"status", "Show what is connected", Limit::Whole, oneDevice(showStatus, knownDevices)}}};

} // namespace Kesbt
