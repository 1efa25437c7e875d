// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_AUTOCONNECT_PIPE_H
#define KESBT_DAEMON_AUTOCONNECT_PIPE_H

#include <bluetooth/auto_connect.h>

namespace Kesbt {

/// Sends a command to the auto-connect daemon. A Failure that says why none takes it.
void sendToDaemon(bool (Bluetooth::AutoConnect::*send)() const);

} // namespace Kesbt

#endif
