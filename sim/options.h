// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_OPTIONS_H
#define KESBLUETOOTH_SIM_OPTIONS_H

#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// What the command line asks for.
struct SimOptions {
    std::string scenario; ///< "" for the built-in one
    double timeScale = 1.0;
    int readyFd = -1;
    bool printReady = false;
    bool verbose = false;
    bool noDaemon = false;
    bool listScenario = false;
    bool listBehaviours = false;
    bool version = false;
    std::vector<std::string> sessionServices;
    std::vector<std::string> command; ///< what to run on private buses; empty: serve in foreground
};

/// Prints the help and exits when it is asked for.
/// @throw std::runtime_error  for wrong usage
SimOptions parseOptions(int argc, char** argv);

} // namespace Bluetooth::Sim

#endif
