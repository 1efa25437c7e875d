#ifndef KESBLUETOOTH_SIM_RUN_SESSION_H
#define KESBLUETOOTH_SIM_RUN_SESSION_H

#include "options.h"

namespace Bluetooth::Sim {

/// Runs a command on private buses with the daemon, and cleans up after it.
/// @return its exit status; 128 + the signal that ended it; 126 or 127 when it cannot be run
/// @throw std::runtime_error  when the buses or the daemon cannot be started
int runSession(const Options& options);

} // namespace Bluetooth::Sim

#endif
