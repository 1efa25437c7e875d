// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/table.h"

#include "show/text.h"

#include <algorithm>
#include <iostream>

namespace Kesbt {

Cell yesNo(const std::string& text) {
    return {text, text == "yes" ? Colour::Green : Colour::Plain};
}

Table::Table(const std::vector<std::string>& headings) {
    std::vector<Cell> row;
    row.reserve(headings.size());
    for (const std::string& heading : headings)
        row.emplace_back(heading, Colour::Bold);
    m_rows.push_back(std::move(row));
}

void Table::add(std::vector<Cell> row) {
    for (Cell& cell : row)
        cell.text = printable(cell.text);
    m_rows.push_back(std::move(row));
}

void Table::print() const {
    std::vector<std::size_t> widths;
    for (const auto& row : m_rows) {
        widths.resize(std::max(widths.size(), row.size()));
        for (std::size_t i = 0; i < row.size(); ++i)
            widths[i] = std::max(widths[i], columns(row[i].text));
    }
    for (const auto& row : m_rows) {
        std::string gap; // written only before further text, so that no line ends in blanks
        for (std::size_t i = 0; i < row.size(); ++i) {
            if (!row[i].text.empty()) {
                std::cout << gap << coloured(row[i].text, row[i].colour);
                gap.clear();
            }
            gap.append(widths[i] - columns(row[i].text) + 2, ' ');
        }
        std::cout << '\n';
    }
}

} // namespace Kesbt
