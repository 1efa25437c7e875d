// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_SCAN_TEXT_H
#define KESBLUETOOTH_SCANNER_SCAN_TEXT_H

#include <bluetooth/variant.h>

#include <string>

namespace Bluetooth {

/// Formats the properties of a found device for the clients of the scan, as dictConquerToString()
/// does with ";". Names and values come from strangers, and nothing is escaped in that form: what
/// would end an entry early is replaced, ";" by "," and a control character by a blank.
/// @return at most 4 KiB: entries for which there is no room are left out
std::string scanText(const Dict& properties);

} // namespace Bluetooth

#endif
