// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/profile.h"

namespace Kesbt {

namespace {

/// Audio has a state only, Input and Network only tell whether they are connected.
bool isConnected(const Json& properties) {
    const std::string state = properties.value("State", "");
    return properties.value("Connected", state == "connected" || state == "playing");
}

} // namespace

void setConnected(const Options& options, Bluetooth::BluezObject& proxy, const std::string& subject,
                  bool connected) {
    Json properties;
    const auto isSettled = [&] {
        properties = readProperties(proxy);
        return properties.value("State", "") != "connecting";
    };
    const auto isDone = [&] { return isSettled() && isConnected(properties) == connected; };
    if (connected) // what is on its way, by another program or the device, is let arrive
        waitUntil(isSettled, options.limit.step());
    if (!isDone())
        ask(options, std::string("cannot ") + (connected ? "connect " : "disconnect ") + subject,
            proxy, connected ? "Connect" : "Disconnect");
    if (!waitUntil(isDone, options.limit.step()))
        throw notConfirmed(subject + " is not " + (connected ? "connected" : "disconnected"));
}

} // namespace Kesbt
