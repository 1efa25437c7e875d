// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVICE_RECORDS_H
#define KESBLUETOOTH_SIM_DAEMON_SERVICE_RECORDS_H

#include "serving.h"
#include "serving/bus/value.h"

#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// The UUID that a pattern of DiscoverServices means: a UUID in any form, or the short name of a
/// service class such as "spp"; "" for anything else.
std::string uuidOfPattern(const std::string& pattern);

/// The records of a device with these service classes, as an a{us} of handles and XML.
/// @param wanted  one service class only, or "" for all
Value serviceRecords(const std::vector<std::string>& uuids, const std::string& wanted);

} // namespace Bluetooth::Sim

#endif
