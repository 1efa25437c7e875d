// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_HCI_VERSION_H
#define KESBLUETOOTH_BLUEZ_HCI_VERSION_H

#include <string>

namespace Bluetooth {

/// What reports a controller's HCI version, which the daemon does not.
extern const char* const hciconfigProgram;

/// @return the last component of an adapter's object path, e.g. "hci0"
std::string controllerName(const char* path);

/// Asks hciconfig for a controller's HCI version, for at most 5 s.
/// @param version receives e.g. "2.1"; "" when the program prints none
/// @return false when the program could not be started, or did not print it within the time
bool readHciVersion(const std::string& controller, std::string& version);

} // namespace Bluetooth

#endif
