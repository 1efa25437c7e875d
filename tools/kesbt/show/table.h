// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_SHOW_TABLE_H
#define KESBT_SHOW_TABLE_H

#include "show/style.h"

#include <string>
#include <vector>

namespace Kesbt {

struct Cell {
    Cell(std::string content, Colour shade = Colour::Plain)
        : text(std::move(content)), colour(shade) {}
    Cell(const char* content) : text(content) {}

    std::string text;
    Colour colour = Colour::Plain;
};

/// "yes" in green, anything else plain.
Cell yesNo(const std::string& text);

/// Rows in aligned columns for people, as wide as the terminal at most where words allow it.
/// Unprintable characters are shown as escapes.
class Table {
public:
    /// A table without headings: name and value, one a line.
    Table() = default;
    explicit Table(const std::vector<std::string>& headings);

    void add(std::vector<Cell> row);
    /// Writes it to standard output.
    void print() const;

private:
    struct Column {
        std::size_t begin;
        bool isOnNewLine; ///< the terminal is too narrow for it beside the others
    };
    std::vector<Column> layOut() const;

    std::vector<std::vector<Cell>> m_rows;
};

} // namespace Kesbt

#endif
