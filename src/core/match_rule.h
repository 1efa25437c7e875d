// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_MATCH_RULE_H
#define KESBLUETOOTH_CORE_MATCH_RULE_H

#include "core/bus_link.h"
#include "core/dbus_ptr.h"

#include <string>

namespace Bluetooth {

/// @return the rule that lets a signal of an object in; the sender is never part of it
std::string signalRule(const std::string& interface, const std::string& member,
                       const std::string& path);

/// Asks the bus to send this process the signals that a rule names (AddMatch). Rules count: one
/// that was added twice has to be removed twice.
/// @param link null is an error
/// @return false with `error` set when the bus refuses, cannot be reached or memory is short
///
/// Blocks until the bus has answered.
bool addMatch(BusLink* link, const std::string& rule, ScopedError& error);

/// Takes a rule back (RemoveMatch). Otherwise as addMatch().
bool removeMatch(BusLink* link, const std::string& rule, ScopedError& error);

} // namespace Bluetooth

#endif
