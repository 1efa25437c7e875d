// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_RUN_FOREGROUND_H
#define KESBLUETOOTH_SIM_RUN_FOREGROUND_H

#include "options.h"

namespace Bluetooth::Sim {

/// Serves org.bluez on the system bus until SIGTERM, SIGINT or Quit.
/// @return the exit status
/// @throw std::runtime_error  when it cannot start, or loses the bus
int serveInForeground(const SimOptions& options);

} // namespace Bluetooth::Sim

#endif
