// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_PRINT_H
#define KESBLUETOOTH_BLUEZ_PRINT_H

#include <initializer_list>
#include <string_view>

namespace Bluetooth {

/// Writes the pieces and a newline to standard output in one go, and flushes it.
void printLine(std::initializer_list<std::string_view> pieces);

} // namespace Bluetooth

#endif
