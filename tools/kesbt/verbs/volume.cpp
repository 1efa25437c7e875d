// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <bluetooth/audio.h>
#include <bluetooth/control.h>

#include <algorithm>
#include <iostream>

namespace Kesbt {

namespace {

/// A headset connects its remote control some seconds after its audio.
bool awaitConnection(const Options& options, Bluetooth::Control& control) {
    constexpr std::chrono::milliseconds longest{5000};
    const auto isConnected = [&control] {
        return readProperties(control).value("Connected", false);
    };
    if (isConnected())
        return true;
    const std::unique_ptr<Bluetooth::Audio> audio(Bluetooth::Audio::getAudio(control.getPath()));
    const Json state = audio ? readOptional(*audio) : Json();
    const bool isComing = state.is_object() && state.value("State", "") != "disconnected";
    return isComing && waitUntil(isConnected, std::min(options.limit.step(), longest));
}

void changeVolume(const Options& options, const std::string& address, bool up) {
    const auto device = openDevice(options, address);
    const std::unique_ptr<Bluetooth::Control> control(
        Bluetooth::Control::getControl(device->getPath()));
    if (!control)
        throw daemonLost();
    if (readOptional(*control).is_null())
        throw notOffered(adapterName(*device), address, "remote control");
    if (!awaitConnection(options, *control))
        throw Failure("the remote control of " + address + " is not connected; connect it first: " +
                      kesbtOn(adapterName(*device)) + " audio connect " + address);

    // The volume itself is not told by the daemon: its answer is all that there is to check.
    const char* direction = up ? "up" : "down";
    ask(options, "cannot change the volume of " + address, *control,
        up ? "VolumeUp" : "VolumeDown");
    if (options.json)
        printDocument({{"address", address}, {"volume", direction}});
    else
        std::cout << "Volume " << direction << " sent to " << address << '\n';
}

void makeLouder(const Options& options, const std::string& address) {
    changeVolume(options, address, true);
}

void makeQuieter(const Options& options, const std::string& address) {
    changeVolume(options, address, false);
}

} // namespace

const Verb volumeVerb = {
    "volume",
    "Audio",
    "Press a connected headset's volume key",
    "kesbt volume up 00:11:22:33:44:55\n"
    "kesbt volume down 00:11:22:33:44:55",
    {{"up", "Make it louder", Limit::Steps, oneDevice(makeLouder, knownDevices)},
     {"down", "Make it quieter", Limit::Steps, oneDevice(makeQuieter, knownDevices)}}};

} // namespace Kesbt
