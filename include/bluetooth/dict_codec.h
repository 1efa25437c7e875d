// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_DICT_CODEC_H
#define KESBLUETOOTH_DICT_CODEC_H

#include <bluetooth/export.h>
#include <bluetooth/variant.h>

#include <string>
#include <vector>

/// @file
/// The text form of property dictionaries: one entry is its name, ": " and its value, and every
/// entry is followed by a terminator:
/// @code
///     Address: 00:11:22:33:44:55;Class: 360;Paired: 0;UUIDs: [a1, b2];
/// @endcode
/// Nothing is escaped: a name or value that contains the terminator, or a name that contains ":",
/// is not parsed back. So who chooses a value, as a stranger chooses the name of a device, can
/// forge entries: replace the terminator in it first, as the scanner service does. Types are not
/// parsed back either: every parsed value is a string.
///
/// None of these functions logs, depends on the locale, or fails except for lack of memory. Strings
/// may contain any bytes. Any thread may call them.

namespace Bluetooth {

/// Formats a value.
/// @return decimal digits for a number, "1" or "0" for a boolean, a string as it is, an array as
///         stringArrayToString() formats it
KESBLUETOOTH_API std::string variantToString(const Variant& value);

/// Returns the boolean that a value holds.
/// @return the boolean; false for every other type. Nothing is converted: the string "1" is false
KESBLUETOOTH_API bool variantToBool(const Variant& value);

/// Formats an array of strings.
/// @return the elements joined by ", " in square brackets, e.g. "[a1, b2]"; "[]" for none
KESBLUETOOTH_API std::string stringArrayToString(const std::vector<std::string>& texts);

/// Formats a dictionary as lines.
/// @return the entries in their order, each ended by a newline; "" for an empty dictionary
KESBLUETOOTH_API std::string dictToString(const Dict& dict);

/// Formats a dictionary with a given terminator.
/// @param dict       the properties
/// @param terminator follows every entry, the last one too, e.g. ";"
/// @return the entries in their order; "" for an empty dictionary
KESBLUETOOTH_API std::string dictConquerToString(const Dict& dict, const std::string& terminator);

/// Looks up a property by its exact name; the first of two equal names counts.
/// @param dict may be null
/// @param name may be null
/// @return the value as variantToString() formats it; "" when there is none
KESBLUETOOTH_API std::string find(const Dict* dict, const char* name);

/// Parses one entry: the name is everything before the first ":", the value everything after it,
/// both without white space around them.
/// @return a new entry with a string value, deleted by the caller; null when there is no ":"
KESBLUETOOTH_API DictEntry* stringToEntry(const std::string& item);

/// Parses a dictionary. Items without ":" are skipped. What follows the last separator is not
/// read: every entry must be terminated, as dictConquerToString() does.
/// @param text       the formatted dictionary
/// @param separators a set of characters, each of which ends an item
/// @return a new dictionary, deleted by the caller; null when it would have no entry
KESBLUETOOTH_API Dict* stringDivideToDict(const std::string& text, const std::string& separators);

} // namespace Bluetooth

#endif
