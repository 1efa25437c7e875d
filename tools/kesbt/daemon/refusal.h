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

/// What the daemon answered, with advice where there is any for the error's name. Its text, which
/// is the daemon's and may be another one tomorrow, makes advice more exact where it is known.
/// @param what what was not possible, e.g. "cannot start a discovery on hci0"
Failure refusal(const std::string& what, Bluetooth::RemoteObject& proxy);
/// @param adapter which one the advice is for; "" where it is for none
Failure refusal(const std::string& what, const std::string& errorName, const std::string& text,
                const std::string& adapter = "");

/// Whether the proxy's last call failed with this error of BlueZ's, e.g. "DoesNotExist".
bool failedWith(const Bluetooth::RemoteObject& proxy, const char* error);
/// Whether it failed since there is no such object, or not with this interface (any more).
bool lacksObject(const Bluetooth::RemoteObject& proxy);
/// Whether the daemon, which is there, has not answered in time.
bool hasTimedOut(const Bluetooth::RemoteObject& proxy);

/// The program with the option that chooses the adapter, for advice: which adapter is the default
/// one may change, and another one may have been asked for.
std::string kesbtOn(const std::string& adapter);

/// The adapter does not know a device.
Failure unknownDevice(const std::string& adapter, const std::string& address);
/// The device has nothing that the daemon serves under this interface.
/// @param what e.g. "audio"
Failure notOffered(const std::string& adapter, const std::string& address, const std::string& what);

/// The adapter cannot go on.
Failure adapterRemoved(const std::string& adapter);
Failure adapterOff(const std::string& adapter);

} // namespace Kesbt

#endif
