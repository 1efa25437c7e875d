// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVICE_RECORDS_H
#define KESBLUETOOTH_SIM_DAEMON_SERVICE_RECORDS_H

#include "serving.h"
#include "serving/bus/value.h"
#include "world/peer_device.h"

#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// The UUID that a pattern of DiscoverServices means: a UUID in any form, or the short name of a
/// service class such as "spp"; "" for anything else.
std::string uuidOfPattern(const std::string& pattern);

/// The same for the patterns of Serial and SerialProxyManager: a short name, the number of a
/// service that has one, or any text of the form of a UUID, which is taken as it is.
std::string serviceNamed(const std::string& pattern);

/// The RFCOMM channel of a service class, given in full; 0 when it has none.
int rfcommChannel(const std::string& uuid);

struct ServiceRecord {
    guint32 handle;
    std::string uuid; ///< its service class
    std::string xml;
};

/// The records of a device.
/// @param wanted  only those that have this UUID anywhere in them; "" for all
std::vector<ServiceRecord> serviceRecords(const PeerDevice& peer, const std::string& wanted);

/// The same as an a{us} of handles and XML.
Value recordValues(const std::vector<ServiceRecord>& records);

} // namespace Bluetooth::Sim

#endif
