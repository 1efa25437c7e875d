// SPDX-License-Identifier: LGPL-2.1-or-later
#include "shown_text.h"

namespace AutoConnectd {

std::string shownText(std::string_view bytes) {
    constexpr const char* digits = "0123456789ABCDEF";
    std::string text;
    for (const char byte : bytes) {
        const auto value = static_cast<unsigned char>(byte);
        if (value >= ' ' && value <= '~' && value != '\\')
            text += byte;
        else
            text.append("\\x").append(1, digits[value / 16]).append(1, digits[value % 16]);
    }
    return text;
}

} // namespace AutoConnectd
