// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_CONTROL_ARGUMENTS_H
#define KESBLUETOOTH_SIM_CONTROL_ARGUMENTS_H

#include "serving.h"
#include "serving/bus/call.h"
#include "world/settings.h"

namespace Bluetooth::Sim {

/// The a{sv} at that place of a call's arguments.
Settings settingsOf(const CallPtr& call, gsize index);

/// A variant argument as a message body: a tuple or an av (which may be empty, as a tuple on D-Bus
/// may not) holds all arguments, anything else is the only one.
Value bodyOf(const CallPtr& call, gsize index);

} // namespace Bluetooth::Sim

#endif
