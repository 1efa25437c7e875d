// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_REFUSAL_H
#define KESBT_DAEMON_REFUSAL_H

#include "show/failure.h"

#include <string>

namespace Bluetooth {
class RemoteObject;
}

namespace Kesbt {

/// The bus or the daemon is not there. Looks which of them is missing.
Failure daemonAbsent();
/// The daemon was there when the verb began.
Failure daemonLost();

/// What the daemon answered, with advice where there is any for the error's name: its text is the
/// daemon's and may be another one tomorrow.
/// @param what what was not possible, e.g. "cannot start a discovery on hci0"
Failure refusal(const std::string& what, Bluetooth::RemoteObject& proxy);
Failure refusal(const std::string& what, const std::string& errorName, const std::string& reason);

/// Whether the proxy's last call failed with this error of BlueZ's, e.g. "DoesNotExist".
bool failedWith(const Bluetooth::RemoteObject& proxy, const char* error);
/// Whether it failed since there is no such object, or not with this interface (any more).
bool lacksObject(const Bluetooth::RemoteObject& proxy);

/// The adapter cannot go on.
Failure adapterRemoved(const std::string& adapter);
Failure adapterOff(const std::string& adapter);

} // namespace Kesbt

#endif
