// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_BUS_NAMES_H
#define KESBLUETOOTH_CORE_BUS_NAMES_H

#include <cstddef>
#include <vector>

namespace Bluetooth {

/// Asks the system bus `times` times whether a name is owned, each time anew, but sends all the
/// questions before it waits for the answers. A question that fails is logged and counts as no.
/// @return the answers, in the order of the questions
std::vector<bool> askWhetherOwned(const char* name, std::size_t times);

} // namespace Bluetooth

#endif
