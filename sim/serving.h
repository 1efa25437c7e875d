// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_SERVING_H
#define KESBLUETOOTH_SIM_SERVING_H

namespace Bluetooth::Serving {}

namespace Bluetooth::Sim {

/// The simulator is written in the terms of `serving/`: Call, Value, Interface and so on.
using namespace Serving;

} // namespace Bluetooth::Sim

#endif
