// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/profile.h"
#include "verbs/list.h"

#include <bluetooth/headset.h>

namespace Kesbt {

namespace {

using Bluetooth::Headset;

Profile<Headset> openHeadset(const Options& options, const std::string& address) {
    return {options, address, Headset::getHeadset, "headset"};
}

void showStatus(const Options& options, const std::string& address) {
    openHeadset(options, address).print(options, address, "headset");
}

template <bool Playing>
void change(const Options& options, const std::string& address) {
    const auto headset = openHeadset(options, address);
    const Json before = readProperties(*headset.proxy);
    if (Playing && !before.value("Connected", false))
        throw Failure("the headset " + address + " is not connected; connect it first: " +
                      kesbtOn(adapterName(*headset.device)) + " audio connect " + address);
    const auto isDone = [&] {
        return readProperties(*headset.proxy).value("Playing", false) == Playing;
    };
    const std::string what =
        std::string("cannot ") + (Playing ? "open" : "close") + " the sound of " + address;
    try {
        if (!isDone())
            ask(options, what, *headset.proxy, Playing ? "Play" : "Stop");
    } catch (const Failure&) {
        if (!failedWith(*headset.proxy, "NotAvailable"))
            throw;
        throw Failure(what + ": bluetoothd does not carry it; set SCORouting=PCM in "
                             "/etc/bluetooth/audio.conf and restart bluetoothd");
    }
    if (!waitUntil(isDone, options.limit.step()))
        throw notConfirmed("the sound of " + address + " is not " + (Playing ? "open" : "closed"));
    headset.print(options, address, "headset");
}

} // namespace

const Verb headsetVerb = {
    "headset",
    "Audio",
    "Open or close a headset's sound for calls",
    "kesbt headset status 00:11:22:33:44:55\n"
    "kesbt headset stop 00:11:22:33:44:55 --json",
    {{"status", "Show its state and volumes", Limit::Whole, oneDevice(showStatus, knownDevices)},
     {"play", "Open the sound of a connected headset", Limit::Steps,
      oneDevice(change<true>, knownDevices)},
     {"stop", "Close it", Limit::Steps, oneDevice(change<false>, knownDevices)}}};

} // namespace Kesbt
