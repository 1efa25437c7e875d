// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_BUS_DRIVER_H
#define KESBLUETOOTH_CORE_BUS_DRIVER_H

#include "core/bus_link.h"
#include "core/dbus_ptr.h"

#include <cstdint>
#include <string>

namespace Bluetooth {

/// Calls a method of the bus itself that takes a string. A call like any other: libdbus's own
/// functions would hold the connection while they wait.
/// @param link          null is an error
/// @param signalsBefore as BusLink::call() takes it
/// @return the reply; null with `error` set when the bus refuses, cannot be reached or memory is
///         short
///
/// Blocks until the bus has answered. Throws nothing.
MessagePtr callBusDriver(BusLink* link, const char* method, const std::string& argument,
                         ScopedError& error, std::uint64_t* signalsBefore = nullptr);

} // namespace Bluetooth

#endif
