// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_SERVICE_RECORD_H
#define KESBT_SHOW_SERVICE_RECORD_H

#include <string>
#include <vector>

namespace Kesbt {

/// What people want to know of a service record.
struct ServiceRecord {
    std::string name;               ///< "" when the record has none
    std::vector<std::string> uuids; ///< the classes of the service, the most special one first
};

/// @param xml the record as the daemon tells it; a broken one gives what could be read
ServiceRecord parseServiceRecord(const std::string& xml);

} // namespace Kesbt

#endif
