// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/text.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <numeric>

namespace Kesbt {

namespace {

/// How many characters have to be inserted, left out, replaced or swapped with their neighbour.
std::size_t distance(const std::string& from, const std::string& to) {
    std::vector<std::size_t> beforeLast(to.size() + 1);
    std::vector<std::size_t> last(to.size() + 1);
    std::iota(last.begin(), last.end(), 0U);
    for (std::size_t i = 1; i <= from.size(); ++i) {
        std::vector<std::size_t> row(to.size() + 1, i);
        for (std::size_t j = 1; j <= to.size(); ++j) {
            const std::size_t replaced = last[j - 1] + (from[i - 1] == to[j - 1] ? 0 : 1);
            row[j] = std::min({last[j] + 1, row[j - 1] + 1, replaced});
            if (i > 1 && j > 1 && from[i - 1] == to[j - 2] && from[i - 2] == to[j - 1])
                row[j] = std::min(row[j], beforeLast[j - 2] + 1);
        }
        beforeLast = std::move(last);
        last = std::move(row);
    }
    return last.back();
}

struct Character {
    unsigned code;
    std::size_t length;
};

/// Reads UTF-8 of up to three bytes, since no control character has more; anything else is a
/// character for each byte, with a code that is none.
Character characterAt(const std::string& text, std::size_t place) {
    const auto byte = [&](std::size_t i) {
        return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U;
    };
    const auto follows = [&](std::size_t i) { return (byte(i) & 0xc0U) == 0x80; };
    const unsigned first = byte(place);
    if (first < 0x80)
        return {first, 1};
    if ((first & 0xe0U) == 0xc0 && follows(place + 1))
        return {(first & 0x1fU) << 6U | (byte(place + 1) & 0x3fU), 2};
    if ((first & 0xf0U) == 0xe0 && follows(place + 1) && follows(place + 2))
        return {(first & 0x0fU) << 12U | (byte(place + 1) & 0x3fU) << 6U |
                    (byte(place + 2) & 0x3fU),
                3};
    return {0x110000, 1};
}

/// What acts on a terminal or changes the order in which the text around it is shown.
bool isControl(unsigned code) {
    const auto isIn = [code](unsigned low, unsigned high) { return code >= low && code <= high; };
    return code < 0x20 || isIn(0x7f, 0x9f) || isIn(0x202a, 0x202e) || isIn(0x2066, 0x2069);
}

} // namespace

std::string upperCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    return text;
}

std::string addressInCapitals(const std::string& text) {
    return isAddress(text) ? upperCase(text) : text;
}

std::string quoted(const std::string& text) {
    return '"' + printable(text) + '"';
}

std::string printable(const std::string& text) {
    std::string result;
    for (std::size_t i = 0; i < text.size();) {
        const auto [code, length] = characterAt(text, i);
        if (code == '\n') {
            result += "\\n";
        } else if (isControl(code)) {
            char escape[8];
            static_cast<void>(
                std::snprintf(escape, sizeof escape, code < 0x100 ? "\\x%02x" : "\\u%04x", code));
            result += escape;
        } else {
            result.append(text, i, length);
        }
        i += length;
    }
    return result;
}

std::size_t columns(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return (static_cast<unsigned char>(c) & 0xc0) != 0x80; // not inside a character
    }));
}

std::string wrapped(std::string text, std::size_t width) {
    for (std::size_t begin = 0; text.size() - begin > width;) {
        const std::size_t blank = text.rfind(' ', begin + width);
        if (blank == std::string::npos || blank < begin)
            break;
        text[blank] = '\n';
        begin = blank + 1;
    }
    return text;
}

std::string padded(const std::string& text, std::size_t width) {
    const std::size_t length = columns(text);
    return text + std::string(length < width ? width - length : 0, ' ');
}

bool isAddress(const std::string& text) {
    constexpr std::size_t length = 17;
    if (text.size() != length)
        return false;
    for (std::size_t i = 0; i < length; ++i) {
        const auto c = static_cast<unsigned char>(text[i]);
        if (i % 3 == 2 ? c != ':' : std::isxdigit(c) == 0)
            return false;
    }
    return true;
}

std::string lastComponent(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

std::string nearest(const std::string& typed, const std::vector<std::string>& words) {
    std::string best;
    std::size_t least = 1 + std::max<std::size_t>(1, typed.size() / 3); // more is another word
    for (const std::string& word : words) {
        const std::size_t mistakes = distance(typed, word);
        if (mistakes < least) {
            least = mistakes;
            best = word;
        }
    }
    return best;
}

} // namespace Kesbt
