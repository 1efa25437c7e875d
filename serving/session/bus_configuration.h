// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_SESSION_BUS_CONFIGURATION_H
#define KESBLUETOOTH_SERVING_SESSION_BUS_CONFIGURATION_H

#include <string>
#include <vector>

namespace Bluetooth::Serving {

/// The configuration of a dbus-daemon that allows everything to everyone who can reach its socket,
/// with the limits of a session bus.
/// @param type  "system" or "session"
/// @param socket  the path of its socket
/// @param serviceFolders  where it looks for services that it can start
std::string busConfiguration(const std::string& type, const std::string& socket,
                             const std::vector<std::string>& serviceFolders);

} // namespace Bluetooth::Serving

#endif
