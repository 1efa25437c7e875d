// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_VARIANT_H
#define KESBLUETOOTH_VARIANT_H

#include <boost/variant.hpp>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

/// @file
/// The values of properties.

namespace Bluetooth {

/// The value of one property. The order of the alternatives is part of the interface; which()
/// returns the one held:
///
/// | which() | type                       | from D-Bus type                 |
/// |---------|----------------------------|---------------------------------|
/// | 0       | std::uint32_t              | u                               |
/// | 1       | std::uint16_t              | q                               |
/// | 2       | bool                       | b                               |
/// | 3       | std::string                | s, o (a path becomes a string)  |
/// | 4       | std::vector<std::string>   | as, ao                          |
/// | 5       | std::int32_t               | n (sign-extended)               |
///
/// A default-constructed Variant holds the unsigned number 0. Values of other D-Bus types cannot
/// be held: a dictionary or signal that contains one fails to decode.
///
/// A string literal converts to bool, not to std::string: write Variant(std::string("text")).
using Variant = boost::variant<std::uint32_t, std::uint16_t, bool, std::string,
                               std::vector<std::string>, std::int32_t>;

/// One property: its name and its value.
using DictEntry = std::pair<std::string, Variant>;

/// A property dictionary: the entries in the order received, duplicates kept.
using Dict = std::vector<DictEntry>;

} // namespace Bluetooth

#endif
