// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_DEVICE_PATHS_H
#define KESBLUETOOTH_BLUEZ_DEVICE_PATHS_H

#include <bluetooth/object_path.h>

#include "core/log.h"

#include <vector>

namespace Bluetooth {

class Adapter;

/// Reads which devices an adapter knows, in one call, without a proxy for each.
/// @return false (logged for the caller) on failure; `paths` is unchanged then
bool readDevicePaths(LogPlace place, Adapter& adapter, std::vector<ObjectPath>& paths);

} // namespace Bluetooth

#endif
