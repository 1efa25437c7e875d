// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_STYLE_H
#define KESBT_SHOW_STYLE_H

#include <cstddef>
#include <string>

namespace Kesbt {

enum class Colour { Plain, Bold, Green, Yellow, Red, Dim };

/// How wide standard output is: its terminal's columns, or COLUMNS; without a limit elsewhere.
std::size_t lineWidth();

/// The text in a colour when standard output is a terminal and NO_COLOR is not set.
std::string coloured(const std::string& text, Colour colour);

} // namespace Kesbt

#endif
