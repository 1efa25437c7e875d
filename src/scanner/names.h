// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_NAMES_H
#define KESBLUETOOTH_SCANNER_NAMES_H

namespace Bluetooth {

/// Where the scanner service is on the session bus.
inline constexpr const char* scannerBusName = "com.kestrine.bluetooth";
inline constexpr const char* scannerPath = "/";
inline constexpr const char* scannerInterface = "com.kestrine.bluetooth.Scanner";

} // namespace Bluetooth

#endif
