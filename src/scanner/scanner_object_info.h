// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_SCANNER_OBJECT_INFO_H
#define KESBLUETOOTH_SCANNER_SCANNER_OBJECT_INFO_H

#include <dbus/dbus-glib.h>

namespace Bluetooth {

/// The method table of ScannerObject and what introspection shows of it.
const DBusGObjectInfo& scannerObjectInfo();

} // namespace Bluetooth

#endif
