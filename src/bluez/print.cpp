// SPDX-License-Identifier: LGPL-2.1-or-later
#include "bluez/print.h"

#include <iostream>
#include <string>

namespace Bluetooth {

void printLine(std::initializer_list<std::string_view> pieces) {
    std::string line;
    for (const std::string_view piece : pieces)
        line += piece;
    line += '\n';
    std::cout << line << std::flush;
}

} // namespace Bluetooth
