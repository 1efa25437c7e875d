// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/text.h"

#include <glib.h>

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
    unsigned code; // the byte itself where no UTF-8 begins
    std::size_t length;
    bool isPrintable;
};

/// What acts on a terminal or changes the order in which the text around it is shown.
bool isControl(unsigned code) {
    const auto isIn = [code](unsigned low, unsigned high) { return code >= low && code <= high; };
    return code < 0x20 || isIn(0x7f, 0x9f) || isIn(0x202a, 0x202e) || isIn(0x2066, 0x2069);
}

Character characterAt(const std::string& text, std::size_t place) {
    const auto byte = static_cast<unsigned char>(text[place]);
    if (byte < 0x80)
        return {byte, 1, !isControl(byte)};
    const gunichar code =
        g_utf8_get_char_validated(text.data() + place, static_cast<gssize>(text.size() - place));
    if (code > 0x10ffff)
        return {byte, 1, false};
    return {code, static_cast<std::size_t>(g_unichar_to_utf8(code, nullptr)), !isControl(code)};
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
        const auto [code, length, isPrintable] = characterAt(text, i);
        if (code == '\n') {
            result += "\\n";
        } else if (!isPrintable) {
            char escape[16];
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

std::string printableJson(const std::string& document) {
    std::string result;
    for (std::size_t i = 0; i < document.size();) {
        const auto [code, length, isPrintable] = characterAt(document, i);
        char escape[16] = "";
        if (!isPrintable && code > 0x20) // those before it are line breaks, or escaped already
            static_cast<void>(std::snprintf(escape, sizeof escape, "\\u%04x", code));
        result.append(*escape ? escape : document.substr(i, length));
        i += length;
    }
    return result;
}

std::size_t columns(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return (static_cast<unsigned char>(c) & 0xc0) != 0x80; // not inside a character
    }));
}

std::string wrapped(std::string line, std::size_t width, std::size_t indent) {
    for (std::size_t begin = 0; line.size() - begin > width;) {
        std::size_t blank = line.rfind(' ', begin + width);
        if (blank == std::string::npos || blank <= begin + indent)
            blank = line.find(' ', begin + std::max(width, indent) + 1);
        if (blank == std::string::npos)
            break;
        const std::size_t end = line.find_last_not_of(' ', blank) + 1;
        line.replace(end, blank + 1 - end, '\n' + std::string(indent, ' '));
        begin = end + 1;
    }
    return line;
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
