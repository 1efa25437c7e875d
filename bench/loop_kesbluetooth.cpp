// SPDX-License-Identifier: LGPL-2.1-or-later
// A program with a receive thread and nothing else: prints "ready", and after SIGTERM how long the
// loop took to end, in seconds.

#include "names.h"

#include <bluetooth/remote_object.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdio>

namespace {

using Clock = std::chrono::steady_clock;

Bluetooth::RemoteObject* loop = nullptr;
std::atomic<Clock::rep> stopped{0};

void stop(int) {
    stopped = Clock::now().time_since_epoch().count();
    loop->stopLoop();
}

} // namespace

int main() {
    Bluetooth::RemoteObject proxy(Bench::peerName, Bench::peerPath, Bench::peerInterface,
                                  DBUS_BUS_SYSTEM);
    loop = &proxy;
    const auto ignore = [](Bluetooth::RemoteObject*, const char*) {};
    if (std::signal(SIGTERM, stop) == SIG_ERR ||
        proxy.setSignalHandlerString("Tick", ignore) != 0 || proxy.startLoop() != 0)
        return 1;
    (void)std::puts("ready");
    (void)std::fflush(stdout);
    proxy.waitLoop();
    const Clock::duration end = Clock::now().time_since_epoch();
    (void)std::printf("%.9f\n",
                      std::chrono::duration<double>(end - Clock::duration(stopped)).count());
    return 0;
}
