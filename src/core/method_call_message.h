// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_METHOD_CALL_MESSAGE_H
#define KESBLUETOOTH_CORE_METHOD_CALL_MESSAGE_H

#include "core/dbus_ptr.h"

#include <string>

namespace Bluetooth {

/// Makes a method call message. The destination, path and interface must be valid names.
/// @return null for a method that is no valid name, or without memory
MessagePtr newMethodCall(const std::string& destination, const std::string& path,
                         const std::string& interface, const char* method);

} // namespace Bluetooth

#endif
