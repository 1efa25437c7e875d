// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_SCAN_SERVICE_H
#define KESBT_DAEMON_SCAN_SERVICE_H

#include "show/output.h"

#include <bluetooth/scanner.h>

#include <map>
#include <string>

namespace Kesbt {

/// Which process the scanner service is, "" for none. It ends by itself and is started by
/// questions.
std::string scanServiceOwner();

/// The properties of each device that the shared scan has found and the adapter does not know, by
/// address. Starts the scan.
std::map<std::string, Json> readFound(Bluetooth::Scanner& scanner, const std::string& adapter);

} // namespace Kesbt

#endif
