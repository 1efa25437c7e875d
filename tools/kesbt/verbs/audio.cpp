// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>

namespace Kesbt {

namespace {

/// A device's audio: all its profiles together.
struct AudioDevice {
    std::unique_ptr<Bluetooth::Device> device;
    std::unique_ptr<Bluetooth::Audio> audio;
};

AudioDevice openAudio(const Options& options, const std::string& address) {
    AudioDevice opened;
    opened.device = openDevice(options, address);
    opened.audio.reset(Bluetooth::Audio::getAudio(opened.device->getPath()));
    if (!opened.audio)
        throw daemonLost();
    if (readOptional(*opened.audio).is_null())
        throw notOffered(adapterName(*opened.device), address, "audio");
    return opened;
}

template <class Proxy>
Json readOptional(Proxy* created) {
    const std::unique_ptr<Proxy> proxy(created);
    if (!proxy)
        throw daemonLost();
    return Kesbt::readOptional(*proxy);
}

void printStatus(const Options& options, AudioDevice& device, const std::string& address) {
    const char* path = device.device->getPath();
    const Json document = {{"address", address},
                           {"adapter", adapterName(*device.device)},
                           {"audio", readProperties(*device.audio)},
                           {"sink", readOptional(Bluetooth::AudioSink::getAudioSink(path))},
                           {"control", readOptional(Bluetooth::Control::getControl(path))}};
    if (options.json) {
        printDocument(document);
        return;
    }
    const auto part = [&](const char* name) {
        return document[name].is_null() ? Json("none") : document[name];
    };
    printProperties(
        {{"Audio", part("audio")}, {"Sink", part("sink")}, {"Remote control", part("control")}});
}

void change(const Options& options, const std::string& address, bool connect) {
    AudioDevice device = openAudio(options, address);
    const auto isThere = [&] {
        const std::string state = readProperties(*device.audio).value("State", "");
        return connect ? state == "connected" || state == "playing" : state == "disconnected";
    };
    // The daemon refuses what is so already.
    if (!isThere())
        ask(options, std::string("cannot ") + (connect ? "connect " : "disconnect ") + address,
            *device.audio, connect ? "Connect" : "Disconnect");
    if (!waitUntil(isThere, options.limit.step()))
        throw notConfirmed(address + " is not " + (connect ? "connected" : "disconnected"));
    printStatus(options, device, address);
}

void connect(const Options& options, const std::string& address) {
    change(options, address, true);
}

void disconnect(const Options& options, const std::string& address) {
    change(options, address, false);
}

void showStatus(const Options& options, const std::string& address) {
    AudioDevice device = openAudio(options, address);
    printStatus(options, device, address);
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
