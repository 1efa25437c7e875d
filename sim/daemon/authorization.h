// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_AUTHORIZATION_H
#define KESBLUETOOTH_SIM_DAEMON_AUTHORIZATION_H

#include <functional>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// Asks the adapter's agent whether a device may use a service; a trusted device may without that.
/// @param onAnswer  called once, at once or later, unless the device goes before
/// @return false when nobody can be asked: onAnswer is not called
bool authorize(ServedDevice& device, const std::string& uuid, std::function<void(bool)> onAnswer);

} // namespace Bluetooth::Sim

#endif
