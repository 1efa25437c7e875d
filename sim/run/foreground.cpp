// SPDX-License-Identifier: LGPL-2.1-or-later
#include "run/foreground.h"

#include "control/control_interface.h"
#include "serving/session/main_loop.h"
#include "serving/session/process.h"
#include "world/scenario.h"

#include <stdexcept>
#include <unistd.h>

namespace Bluetooth::Sim {

namespace {

void tellWhoAsked(const SimOptions& options) {
    if (options.readyFd >= 0) {
        tellReady(options.readyFd, "bluez4-sim");
        close(options.readyFd);
    }
    if (options.printReady)
        tellReady(STDOUT_FILENO, "bluez4-sim");
}

} // namespace

int serveInForeground(const SimOptions& options) {
    World world = options.scenario.empty() ? loadDefaultScenario() : loadScenario(options.scenario);
    world.times.scale = options.timeScale;

    MainLoop loop;
    bool busLost = false;
    try {
        ControlInterface control(world, systemBusAddress(), options.verbose);
        control.watchQuit([&] { loop.quit(); });
        control.daemon().watchBus([&] {
            busLost = true;
            loop.quit();
        });
        control.daemon().start(static_cast<int>(getpid()));
        control.daemon().bus().afterRoundTrip([&] { tellWhoAsked(options); });
        loop.run();
        if (control.daemon().running() && !busLost)
            control.daemon().stop();
    } catch (const std::exception& reason) { // most users do not want the machine's bus
        throw std::runtime_error(std::string(reason.what()) +
                                 "; or give it buses of its own: bluez4-sim -- COMMAND");
    }
    if (busLost)
        throw std::runtime_error("the system bus has ended");
    return 0;
}

} // namespace Bluetooth::Sim
