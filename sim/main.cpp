// SPDX-License-Identifier: LGPL-2.1-or-later
#include "options.h"
#include "run/command.h"
#include "run/foreground.h"
#include "world/behaviour.h"
#include "world/scenario.h"

#include <glib.h>

#include <exception>

using namespace Bluetooth::Sim;

namespace {

constexpr int wrongUsage = 2;

int run(const SimOptions& options) {
    if (options.version) {
        g_print("bluez4-sim " KESBLUETOOTH_VERSION ", simulating BlueZ 4.101\n");
        return 0;
    }
    if (options.listScenario) {
        g_print("%s", defaultScenarioText());
        return 0;
    }
    if (options.listBehaviours) {
        for (const Behaviour& behaviour : behaviours())
            g_print("%-22s%s\n", behaviour.name, behaviour.description);
        return 0;
    }
    return options.command.empty() ? serveInForeground(options) : runCommand(options);
}

} // namespace

int main(int argc, char** argv) {
    SimOptions options;
    try {
        options = parseOptions(argc, argv);
    } catch (const std::exception& wrong) {
        g_printerr("bluez4-sim: %s; see bluez4-sim --help\n", wrong.what());
        return wrongUsage;
    }
    try {
        return run(options);
    } catch (const std::exception& failure) {
        g_printerr("bluez4-sim: %s\n", failure.what());
        return 1;
    }
}
