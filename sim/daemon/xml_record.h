// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_XML_RECORD_H
#define KESBLUETOOTH_SIM_DAEMON_XML_RECORD_H

#include <optional>
#include <string>

namespace Bluetooth::Sim {

/// Reads a service record in the daemon's XML, as tolerantly as the daemon does: what it does not
/// know is passed over, and the end may be missing.
/// @return its first service class as a full UUID, "" when it has none; nothing when the text is
///         not XML
std::optional<std::string> serviceClassOfXml(const std::string& xml);

} // namespace Bluetooth::Sim

#endif
