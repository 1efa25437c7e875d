// SPDX-License-Identifier: LGPL-2.1-or-later
#include "scanner/scan_text.h"

#include <bluetooth/dict_codec.h>

namespace Bluetooth {

namespace {

constexpr std::size_t longestText = 4096;

/// @param text valid UTF-8, as everything that comes from a bus
std::string harmless(const std::string& text) {
    std::string result;
    result.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        // U+0080 to U+009F are control characters too; in UTF-8 they begin with 0xc2.
        const bool wide =
            byte == 0xc2 && i + 1 < text.size() && static_cast<unsigned char>(text[i + 1]) < 0xa0;
        if (wide)
            ++i;
        if (wide || byte < 0x20 || byte == 0x7f)
            result += ' ';
        else
            result += byte == ';' ? ',' : text[i];
    }
    return result;
}

Variant harmless(const Variant& value) {
    if (const auto* text = boost::get<std::string>(&value))
        return harmless(*text);
    const auto* texts = boost::get<std::vector<std::string>>(&value);
    if (!texts)
        return value;
    std::vector<std::string> elements;
    elements.reserve(texts->size());
    for (const std::string& text : *texts)
        elements.push_back(harmless(text));
    return elements;
}

} // namespace

std::string scanText(const Dict& properties) {
    std::string result;
    for (const auto& [name, value] : properties) {
        const std::string entry =
            dictConquerToString({DictEntry(harmless(name), harmless(value))}, ";");
        if (entry.size() <= longestText - result.size())
            result += entry;
    }
    return result;
}

} // namespace Bluetooth
