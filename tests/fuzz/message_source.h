// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_FUZZ_MESSAGE_SOURCE_H
#define KESBLUETOOTH_TESTS_FUZZ_MESSAGE_SOURCE_H

#include "core/dbus_ptr.h"

#include <fuzzer/FuzzedDataProvider.h>

namespace Bluetooth::Fuzz {

/// The names that the fuzzed dispatchers listen to.
inline constexpr const char* path = "/org/bluez/1/hci0";
inline constexpr const char* interface = "org.bluez.Adapter";
inline constexpr const char* member = "Changed";

/// Makes `bytes` a message. Half of all inputs are a whole message as it would come from the
/// socket. The other half choose the arguments of one that is well-formed, of any types and any
/// nesting: mutated bytes seldom get past libdbus's validation.
/// @param type DBUS_MESSAGE_TYPE_..., for the well-formed half
/// @return null when libdbus refuses the bytes
MessagePtr takeMessage(FuzzedDataProvider& bytes, int type, const char* interfaceName,
                       const char* memberName);

} // namespace Bluetooth::Fuzz

#endif
