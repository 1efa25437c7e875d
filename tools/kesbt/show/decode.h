// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_DECODE_H
#define KESBT_SHOW_DECODE_H

#include "show/output.h"

#include <dbus/dbus.h>

namespace Kesbt {

/// All arguments of a message, of any type, as an array. What JSON has no form for is null.
Json decodeArguments(DBusMessage* message);

} // namespace Kesbt

#endif
