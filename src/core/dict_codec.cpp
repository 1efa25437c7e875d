// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/dict_codec.h>

#include <memory>
#include <optional>
#include <string_view>

namespace Bluetooth {

namespace {

void appendArray(std::string& text, const std::vector<std::string>& elements) {
    text += '[';
    const char* separator = "";
    for (const std::string& element : elements) {
        text += separator;
        text += element;
        separator = ", ";
    }
    text += ']';
}

void appendValue(std::string& text, const Variant& value) {
    switch (value.which()) {
    case 0:
        text += std::to_string(boost::get<std::uint32_t>(value));
        break;
    case 1:
        text += std::to_string(boost::get<std::uint16_t>(value));
        break;
    case 2:
        text += boost::get<bool>(value) ? '1' : '0';
        break;
    case 3:
        text += boost::get<std::string>(value);
        break;
    case 4:
        appendArray(text, boost::get<std::vector<std::string>>(value));
        break;
    case 5:
        text += std::to_string(boost::get<std::int32_t>(value));
        break;
    default:
        text += "Unknown variant";
    }
}

std::string_view trim(std::string_view text) {
    constexpr const char* whiteSpace = " \t\n\v\f\r";
    const std::size_t first = text.find_first_not_of(whiteSpace);
    if (first == std::string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(whiteSpace) - first + 1);
}

std::optional<DictEntry> parseEntry(std::string_view item) {
    const std::size_t colon = item.find(':');
    if (colon == std::string_view::npos)
        return std::nullopt;
    return DictEntry(trim(item.substr(0, colon)), std::string(trim(item.substr(colon + 1))));
}

} // namespace

std::string variantToString(const Variant& value) {
    std::string text;
    appendValue(text, value);
    return text;
}

bool variantToBool(const Variant& value) {
    const bool* held = boost::get<bool>(&value);
    return held && *held;
}

std::string stringArrayToString(const std::vector<std::string>& texts) {
    std::string text;
    appendArray(text, texts);
    return text;
}

std::string dictToString(const Dict& dict) {
    return dictConquerToString(dict, "\n");
}

std::string dictConquerToString(const Dict& dict, const std::string& terminator) {
    std::string text;
    for (const auto& [name, value] : dict) {
        text += name;
        text += ": ";
        appendValue(text, value);
        text += terminator;
    }
    return text;
}

std::string find(const Dict* dict, const char* name) {
    if (!dict || !name)
        return {};
    for (const auto& [entryName, value] : *dict) {
        if (entryName == name)
            return variantToString(value);
    }
    return {};
}

DictEntry* stringToEntry(const std::string& item) {
    std::optional<DictEntry> entry = parseEntry(item);
    return entry ? new DictEntry(std::move(*entry)) : nullptr;
}

Dict* stringDivideToDict(const std::string& text, const std::string& separators) {
    auto dict = std::make_unique<Dict>();
    std::size_t start = 0;
    for (std::size_t end; (end = text.find_first_of(separators, start)) != std::string::npos;
         start = end + 1) {
        const std::string_view item(text.data() + start, end - start);
        if (std::optional<DictEntry> entry = parseEntry(item))
            dict->push_back(std::move(*entry));
    }
    return dict->empty() ? nullptr : dict.release();
}

} // namespace Bluetooth
