// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_ADDRESS_H
#define KESBLUETOOTH_SERVING_BLUEZ4_ADDRESS_H

#include <glib.h>

#include <string>

namespace Bluetooth::Serving {

/// Whether the text is six two-digit hexadecimal groups with colons.
inline bool isAddress(const std::string& text) {
    if (text.size() != 17)
        return false;
    for (std::size_t i = 0; i < text.size(); ++i)
        if (i % 3 == 2 ? text[i] != ':' : !g_ascii_isxdigit(text[i]))
            return false;
    return true;
}

inline std::string upperCase(std::string text) {
    for (char& c : text)
        c = g_ascii_toupper(c);
    return text;
}

inline std::string withSeparator(std::string address, char separator) {
    for (char& c : address)
        if (c == ':')
            c = separator;
    return address;
}

} // namespace Bluetooth::Serving

#endif
