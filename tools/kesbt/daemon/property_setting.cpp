// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/property_setting.h"

#include "show/text.h"
#include "wait/waiting.h"

#include <glib.h>

#include <charconv>
#include <iostream>
#include <limits>

namespace Kesbt {

namespace {

using Bluetooth::Variant;
using Words = std::vector<std::string>;

constexpr std::size_t longestName = 248; // bytes; the controller cuts what is longer

bool parseBoolean(const std::string& text) {
    const std::string upper = upperCase(text);
    for (const char* yes : {"TRUE", "ON", "YES", "1"}) {
        if (upper == yes)
            return true;
    }
    for (const char* no : {"FALSE", "OFF", "NO", "0"}) {
        if (upper == no)
            return false;
    }
    throw wrongUsage(quoted(text) + " is neither true nor false; write one of them");
}

template <class Number>
Number parseNumber(const std::string& text) {
    Number number{};
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end != text.data() + text.size())
        throw wrongUsage(quoted(text) + " is no number from 0 to " +
                         std::to_string(std::numeric_limits<Number>::max()) + "; write one");
    return number;
}

/// The text as a value of the type that the property has now.
struct ParseAs : boost::static_visitor<Variant> {
    const std::string& text;
    const std::string& name;
    const std::string& see;

    ParseAs(const std::string& value, const std::string& property, const std::string& advice)
        : text(value), name(property), see(advice) {}

    Variant operator()(std::uint32_t) const { return parseNumber<std::uint32_t>(text); }
    Variant operator()(std::uint16_t) const { return parseNumber<std::uint16_t>(text); }
    Variant operator()(bool) const { return parseBoolean(text); }
    Variant operator()(const std::string&) const {
        if (text.size() > longestName)
            throw wrongUsage(name + " may have at most " + std::to_string(longestName) +
                             " bytes; write a shorter one");
        if (!g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr))
            throw wrongUsage(quoted(text) +
                             " is not UTF-8, as names are; write it on a terminal with UTF-8");
        return text;
    }
    template <class Other>
    Variant operator()(const Other&) const {
        throw Failure(name + " cannot be set; " + see);
    }
};

const Bluetooth::DictEntry* findProperty(const Bluetooth::Dict& all, const std::string& name) {
    for (const auto& entry : all) {
        if (upperCase(entry.first) == upperCase(name))
            return &entry;
    }
    return nullptr;
}

/// Where an alias is emptied the daemon shows the name in its place.
bool hasTaken(const Json& now, const Json& wanted, const Json& old, const Json& name) {
    return now == wanted || (display(wanted).empty() && (now != old || now == name));
}

} // namespace

std::string PropertySetting::see() const {
    return std::string("see what can be set: kesbt ") + command + " --help";
}

void PropertySetting::set(const Options& options, Bluetooth::BluezObject& object,
                          const std::string& subject, const Given& given, Json document) const {
    const Bluetooth::Dict before = readDict(object);
    const Bluetooth::DictEntry* property = findProperty(before, given.name);
    if (!property)
        throw Failure(subject + " has no property " + quoted(given.name) + "; " + see());
    const std::string& name = property->first;
    const Json old = toJson(property->second);
    const Variant value = boost::apply_visitor(ParseAs(given.value, name, see()), property->second);
    object.resetError();
    try {
        ask(options, "cannot set " + name + " of " + subject, object, "SetProperty", name.c_str(),
            value);
    } catch (const Failure&) {
        if (!failedWith(object, "InvalidArguments"))
            throw;
        throw Failure("the daemon does not let " + name + " of " + subject + " be set to " +
                      quoted(given.value) + "; " + see());
    }

    Json now;
    const auto isSet = [&] {
        const Json all = readProperties(object);
        now = all.value(name, Json());
        return hasTaken(now, toJson(value), old, all.value("Name", Json()));
    };
    if (!waitUntil(isSet, options.limit.step()))
        throw notConfirmed(name + " of " + subject + " is still " + quoted(display(now)));
    document.update({{"property", name}, {"old", old}, {"new", now}});
    if (options.json)
        printDocument(document);
    else
        std::cout << name << ": " << printable(display(old)) << " -> " << printable(display(now))
                  << '\n';
}

std::string PropertySetting::help() const {
    std::string text = "Can be set:";
    for (const Property& property : properties)
        text.append(&property == properties.data() ? " " : ", ").append(property.name);
    return text + ". Booleans are true or false" + hint + ".\n\nExamples:\n" + examples + "\n\n";
}

std::shared_ptr<PropertySetting::Given> PropertySetting::addArguments(const Syntax& syntax) const {
    const std::string ofVerb = syntax.app.get_footer(); // as that of the verb alone
    syntax.app.footer(help() + ofVerb.substr(ofVerb.rfind("\n\n") + 2));
    auto given = std::make_shared<Given>();
    const auto add = [&syntax](const char* argument, std::string& text, const char* what,
                               const Choices& choices) {
        syntax.completion.offer(
            syntax.app.add_option(argument, text, what)->required()->type_name(""), choices);
    };
    add("NAME", given->name, "The property", [this](const Words&) {
        Words names;
        for (const Property& property : properties)
            names.emplace_back(property.name);
        return names;
    });
    add("VALUE", given->value, "Its new value", [this](const Words& before) {
        for (const Property& property : properties) {
            if (property.isBoolean && upperCase(property.name) == upperCase(before.back()))
                return Words{"true", "false"};
        }
        return Words{};
    });
    return given;
}

} // namespace Kesbt
