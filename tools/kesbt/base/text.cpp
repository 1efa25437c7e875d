#include "base/text.h"

#include <algorithm>
#include <cctype>
#include <cstdio>

namespace Kesbt {

std::string upperCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
    return text;
}

std::string quoted(const std::string& text) {
    return '"' + printable(text) + '"';
}

std::string printable(const std::string& text) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        // U+0080 to U+009F are control characters too; in UTF-8 they begin with 0xc2.
        const bool wide =
            byte == 0xc2 && i + 1 < text.size() && static_cast<unsigned char>(text[i + 1]) < 0xa0;
        if (byte == '\n') {
            result += "\\n";
        } else if (byte < 0x20 || byte == 0x7f || wide) {
            char escape[8];
            static_cast<void>(std::snprintf(escape, sizeof escape, "\\x%02x",
                                            wide ? static_cast<unsigned char>(text[++i]) : byte));
            result += escape;
        } else {
            result += text[i];
        }
    }
    return result;
}

std::size_t columns(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return (static_cast<unsigned char>(c) & 0xc0) != 0x80; // not inside a character
    }));
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

} // namespace Kesbt
