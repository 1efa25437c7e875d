// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_TEXT_H
#define KESBT_SHOW_TEXT_H

#include <string>
#include <vector>

namespace Kesbt {

std::string upperCase(std::string text);
/// An address in capitals, as the daemon writes it; any other text as it is.
std::string addressInCapitals(const std::string& text);
/// In double quotes, printable.
std::string quoted(const std::string& text);
/// Control characters, those of the writing direction too, as escapes such as \n, \x1b or \u202e,
/// and bytes that are no UTF-8 such as \x9b: names come from strangers' devices.
std::string printable(const std::string& text);
/// A JSON document, which is UTF-8, with the same characters as JSON's own escapes: the data stay.
std::string printableJson(const std::string& document);
/// How many columns a text takes on a terminal, with one for each character.
std::size_t columns(const std::string& text);

/// A line with breaks in place of blanks, so that none is wider where words allow it.
/// @param indent the column that the further lines begin at, and the first too: it is not broken
///               before
std::string wrapped(std::string line, std::size_t width, std::size_t indent = 0);

/// The text with blanks after it, at least so many columns wide.
std::string padded(const std::string& text, std::size_t width);

/// Six two-digit hexadecimal groups joined by colons.
bool isAddress(const std::string& text);
/// The last component of an object path: "hci0" of "/org/bluez/1234/hci0".
std::string lastComponent(const std::string& path);

/// The word that was most likely meant where one was mistyped; "" when none is near.
std::string nearest(const std::string& typed, const std::vector<std::string>& words);

} // namespace Kesbt

#endif
