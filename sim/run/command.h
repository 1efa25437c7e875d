// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_RUN_COMMAND_H
#define KESBLUETOOTH_SIM_RUN_COMMAND_H

#include "options.h"

namespace Bluetooth::Sim {

/// Runs the command on private buses with the daemon.
/// @return its exit status, as a shell gives it
/// @throw std::runtime_error  when the buses or the daemon cannot be started
int runCommand(const SimOptions& options);

} // namespace Bluetooth::Sim

#endif
