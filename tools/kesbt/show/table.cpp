// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/table.h"

#include "show/text.h"

#include <algorithm>
#include <iostream>
#include <sstream>

namespace Kesbt {

Cell yesNo(const std::string& text) {
    return {text, text == "yes" ? Colour::Green : Colour::Plain};
}

namespace {

std::size_t longestWord(const std::string& text) {
    std::istringstream words(text);
    std::size_t longest = 0;
    for (std::string word; words >> word;)
        longest = std::max(longest, columns(word));
    return longest;
}

} // namespace

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

std::vector<Table::Column> Table::layOut() const {
    constexpr std::size_t gap = 2;
    std::vector<std::size_t> widths;
    std::size_t leastRoom = 16; // for the last column, which can be broken between words
    for (const auto& row : m_rows) {
        widths.resize(std::max(widths.size(), row.size()));
        for (std::size_t i = 0; i < row.size(); ++i)
            widths[i] = std::max(widths[i], columns(row[i].text));
        leastRoom = std::max(leastRoom, row.empty() ? 0 : longestWord(row.back().text));
    }
    const std::size_t width = lineWidth();
    std::vector<Column> layout;
    std::size_t begin = 0;
    for (std::size_t i = 0; i < widths.size(); ++i) {
        const bool isLast = i + 1 == widths.size();
        const std::size_t room = begin < width ? width - begin : 0;
        const bool fits = room >= (isLast ? std::min(widths[i], leastRoom) : widths[i]);
        const bool isOnNewLine = i > 0 && !fits;
        begin = isOnNewLine ? gap : begin;
        layout.push_back({begin, isOnNewLine});
        begin += widths[i] + gap;
    }
    return layout;
}

void Table::print() const {
    const std::vector<Column> layout = layOut();
    const std::size_t width = lineWidth();
    for (const auto& row : m_rows) {
        std::size_t at = 0;
        bool breaks = false;
        // Blanks and breaks are written only before further text: no line ends in blanks.
        for (std::size_t i = 0; i < row.size(); ++i) {
            breaks = breaks || layout[i].isOnNewLine;
            if (row[i].text.empty())
                continue;
            const std::size_t begin = layout[i].begin;
            const std::string blanks(begin - (breaks ? 0 : at), ' ');
            std::string text = row[i].text;
            if (i + 1 == layout.size())
                text = wrapped(text.insert(0, begin, ' '), width, begin).substr(begin);
            std::cout << (breaks && at > 0 ? "\n" : "") << blanks << coloured(text, row[i].colour);
            at = begin + columns(row[i].text);
            breaks = false;
        }
        std::cout << '\n';
    }
}

} // namespace Kesbt
