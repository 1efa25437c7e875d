// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/output.h"

#include "show/failure.h"
#include "show/table.h"
#include "show/text.h"
#include "show/uuid.h"

#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <iostream>

namespace Kesbt {

namespace {

std::string hexadecimal(const Json& number, int digits) {
    char text[16];
    static_cast<void>(std::snprintf(text, sizeof text, "0x%0*x", digits, number.get<unsigned>()));
    return text;
}

/// Some properties say more in another form.
std::string displayProperty(const std::string& name, const Json& value) {
    if (name == "Class" && value.is_number())
        return hexadecimal(value, 6);
    if ((name == "Vendor" || name == "Product" || name == "Version") && value.is_number())
        return hexadecimal(value, 4);
    if (name == "RSSI")
        return display(value) + " dBm";
    return display(value);
}

/// JSON leaves most control characters to be written as they are.
void printJson(const Json& json, int indent) {
    const std::string text = json.dump(indent, ' ', false, Json::error_handler_t::replace);
    std::cout << (isatty(STDOUT_FILENO) != 0 ? printableJson(text) : text) << '\n';
}

std::string formatTime(bool local, const char* format, const char* ending) {
    timeval now{};
    gettimeofday(&now, nullptr);
    tm parts{};
    if (local)
        localtime_r(&now.tv_sec, &parts);
    else
        gmtime_r(&now.tv_sec, &parts);
    char seconds[32];
    const std::size_t length = strftime(seconds, sizeof seconds, format, &parts);
    char fraction[8];
    static_cast<void>(std::snprintf(fraction, sizeof fraction, ".%03d",
                                    static_cast<int>(now.tv_usec / 1000) % 1000));
    return std::string(seconds, length) + fraction + ending;
}

} // namespace

Json toJson(const Bluetooth::Variant& value) {
    return boost::apply_visitor([](const auto& held) { return Json(held); }, value);
}

Json toJson(const Bluetooth::Dict& properties) {
    Json object = Json::object();
    for (const auto& [name, value] : properties)
        object[name] = toJson(value);
    return object;
}

std::string display(const Json& value) {
    if (value.is_boolean())
        return value.get<bool>() ? "yes" : "no";
    if (value.is_string())
        return value.get<std::string>();
    if (!value.is_structured())
        return value.dump();
    std::string text;
    for (const auto& [key, element] : value.items()) {
        text += text.empty() ? "" : ", ";
        text += (value.is_object() ? key + "=" : "") + display(element);
    }
    return text;
}

std::string field(const Json& properties, const char* name) {
    const auto found = properties.find(name);
    return found == properties.end() ? "" : displayProperty(name, *found);
}

void printDocument(const Json& document) {
    printJson(document, 2);
}

void printEvent(const Json& event) {
    printJson(event, -1);
    flushOutput();
}

void printHint(const std::string& text) {
    if (isatty(STDERR_FILENO) != 0)
        std::cerr << text << '\n';
}

void flushOutput() {
    errno = 0;
    if (!std::cout.flush())
        throw Failure(std::string("cannot write the results: ") +
                      (errno != 0 ? std::strerror(errno) : "standard output is closed") +
                      "; check where standard output goes");
}

void printProperties(const Json& properties) {
    Table table;
    for (const auto& [name, value] : properties.items()) {
        if (!value.is_array() || value.empty()) {
            table.add(
                {{name, Colour::Bold}, value.empty() ? "none" : displayProperty(name, value)});
            continue;
        }
        std::string heading = name;
        for (const auto& element : value) {
            std::string text = display(element);
            const std::string meaning = uuidName(text);
            text.append(meaning.empty() ? 0 : 2, ' ').append(meaning);
            table.add({{heading, Colour::Bold}, text});
            heading.clear();
        }
    }
    table.print();
}

std::string timeForPrograms() {
    return formatTime(false, "%Y-%m-%dT%H:%M:%S", "Z");
}

std::string timeForPeople() {
    return formatTime(true, "%H:%M:%S", "");
}

} // namespace Kesbt
