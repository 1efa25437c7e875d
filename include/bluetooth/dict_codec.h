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
/// Nothing is escaped. A name or value that holds the terminator, or a name that holds ":", does
/// not come back from its text. Types do not come back either: every parsed value is a text.
///
/// None of these functions logs, depends on the locale, or fails but for lack of memory. Strings
/// may hold any bytes. All may be called from any thread.

namespace Bluetooth {

/// A value as text.
/// @return the value as text: decimal digits for numbers, "1" or "0" for a boolean, a text as it
///         is, an array as stringArrayToString() gives it
KESBLUETOOTH_API std::string variantToString(const Variant& value);

/// A value as boolean.
/// @return the boolean held; false for every other type. Nothing is converted: the text "1" is
///         false
KESBLUETOOTH_API bool variantToBool(const Variant& value);

/// An array as text.
/// @return the elements joined by ", " in square brackets, e.g. "[a1, b2]"; "[]" for none
KESBLUETOOTH_API std::string stringArrayToString(const std::vector<std::string>& texts);

/// A dictionary as lines.
/// @return the entries in their order, each ended by a newline; "" for an empty dictionary
KESBLUETOOTH_API std::string dictToString(const Dict& dict);

/// A dictionary as text, with a terminator of the caller's.
/// @param dict       the properties
/// @param terminator follows every entry, the last one too, e.g. ";"
/// @return the entries in their order; "" for an empty dictionary
KESBLUETOOTH_API std::string dictConquerToString(const Dict& dict, const std::string& terminator);

/// Looks a property up by its exact name, from the front: the first of two equal names wins.
/// @param dict may be null
/// @param name may be null
/// @return the value as text; "" when there is none
KESBLUETOOTH_API std::string find(const Dict* dict, const char* name);

/// Parses one entry. The name is what stands before the first ":", the value all that follows;
/// white space around either is dropped.
/// @return a new entry with a text value, deleted by the caller; null when there is no ":"
KESBLUETOOTH_API DictEntry* stringToEntry(const std::string& item);

/// Parses a dictionary. Items without ":" are skipped. What follows the last separator is not
/// read: every entry must be terminated, as dictConquerToString() does it.
/// @param text       what to parse
/// @param separators a set of characters, each of which ends an item
/// @return a new dictionary, deleted by the caller; null when it would have no entry
KESBLUETOOTH_API Dict* stringDivideToDict(const std::string& text, const std::string& separators);

} // namespace Bluetooth

#endif
