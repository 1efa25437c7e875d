// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_BUS_ERROR_H
#define KESBLUETOOTH_SERVING_BUS_BUS_ERROR_H

#include <string>

namespace Bluetooth::Serving {

/// A D-Bus error reply: its name and its text.
struct BusError {
    std::string name;
    std::string text;
};

} // namespace Bluetooth::Serving

#endif
