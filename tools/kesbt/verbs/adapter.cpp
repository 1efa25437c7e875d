// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/objects.h"
#include "show/text.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <charconv>
#include <iostream>
#include <limits>

namespace Kesbt {

namespace {

using Bluetooth::Variant;

/// What the daemon lets be set, for the help and for completion.
struct SettableProperty {
    const char* name;
    bool isBoolean;
};
constexpr SettableProperty settable[] = {{"Name", false},
                                         {"Powered", true},
                                         {"Discoverable", true},
                                         {"Pairable", true},
                                         {"DiscoverableTimeout", false},
                                         {"PairableTimeout", false}};

constexpr std::size_t longestName = 248; // bytes; the controller cuts what is longer

void showAdapter(const Options& options) {
    const auto manager = openManager();
    const auto adapter = openAdapter(*manager, options);
    // The proxy's own properties: they have the HCI version too.
    const std::unique_ptr<Bluetooth::Dict> properties(adapter->getProperties());
    if (!properties)
        throw refusal("cannot read the properties of " + adapterName(*adapter), *adapter);
    const bool isDefault = adapter->getPath() == defaultAdapterPath(*manager);
    const Json document = describe(*adapter, isDefault, toJson(*properties));
    if (options.json) {
        printDocument(document);
        return;
    }
    Json lines = {{"Adapter", document["adapter"]},
                  {"Path", document["path"]},
                  {"Default", document["default"]}};
    lines.update(document["properties"]);
    printProperties(lines);
}

const Bluetooth::DictEntry& findProperty(const Bluetooth::Dict& properties, const std::string& name,
                                         const std::string& adapter) {
    for (const auto& entry : properties) {
        if (upperCase(entry.first) == upperCase(name))
            return entry;
    }
    throw Failure(adapter + " has no property " + quoted(name) +
                  "; see what can be set: kesbt adapter set --help");
}

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

    ParseAs(const std::string& value, const std::string& property) : text(value), name(property) {}

    Variant operator()(std::uint32_t) const { return parseNumber<std::uint32_t>(text); }
    Variant operator()(std::uint16_t) const { return parseNumber<std::uint16_t>(text); }
    Variant operator()(bool) const { return parseBoolean(text); }
    Variant operator()(const std::string&) const {
        if (text.size() > longestName)
            throw wrongUsage(name + " may have at most " + std::to_string(longestName) +
                             " bytes; write a shorter one");
        return text;
    }
    template <class Other>
    Variant operator()(const Other&) const {
        throw Failure(name + " cannot be set; see what can: kesbt adapter set --help");
    }
};

void setProperty(const Options& options, const std::string& givenName,
                 const std::string& givenValue) {
    const auto adapter = openAdapter(options);
    const std::string adapterText = adapterName(*adapter);
    const Bluetooth::Dict properties = readDict(*adapter);
    const auto& [name, old] = findProperty(properties, givenName, adapterText);
    const Variant wanted = boost::apply_visitor(ParseAs(givenValue, name), old);
    adapter->resetError();
    try {
        ask(options, "cannot set " + name + " of " + adapterText, *adapter, "SetProperty",
            name.c_str(), wanted);
    } catch (const Failure&) {
        if (!failedWith(*adapter, "InvalidArguments"))
            throw;
        throw Failure("the daemon does not let " + name + " of " + adapterText + " be set to " +
                      quoted(givenValue) + "; see what can be set: kesbt adapter set --help");
    }

    Json now;
    const Json expected = toJson(wanted);
    const auto isSet = [&, &property = name] {
        now = readProperties(*adapter).value(property, Json());
        return now == expected;
    };
    if (!waitUntil(isSet, options.limit.step()))
        throw notConfirmed(name + " of " + adapterText + " is still " + quoted(display(now)));
    if (options.json)
        printDocument(
            {{"adapter", adapterText}, {"property", name}, {"old", toJson(old)}, {"new", now}});
    else
        std::cout << name << ": " << printable(display(toJson(old))) << " -> "
                  << printable(display(now)) << '\n';
}

std::string settableText() {
    std::string text = "Can be set:";
    for (const SettableProperty& property : settable)
        text.append(&property == settable ? " " : ", ").append(property.name);
    return text + ". Booleans are true or false, time-outs are seconds.";
}

using Words = std::vector<std::string>;

Words propertyNames(const Words&) {
    Words names;
    for (const SettableProperty& property : settable)
        names.emplace_back(property.name);
    return names;
}

Words propertyValues(const Words& before) {
    for (const SettableProperty& property : settable) {
        if (property.isBoolean && upperCase(property.name) == upperCase(before.front()))
            return {"true", "false"};
    }
    return {};
}

Action buildSet(const Syntax& syntax) {
    const std::string ofVerb = syntax.app.get_footer(); // as that of the verb alone
    syntax.app.footer(settableText() +
                      "\n\nExamples:\n  kesbt adapter set Powered true\n"
                      "  kesbt --adapter hci1 adapter set Name \"Living room\"\n\n" +
                      ofVerb.substr(ofVerb.rfind("\n\n") + 2));
    auto name = std::make_shared<std::string>();
    auto value = std::make_shared<std::string>();
    const auto add = [&syntax](const char* argument, std::string& text, const char* what,
                               const Choices& choices) {
        syntax.completion.offer(
            syntax.app.add_option(argument, text, what)->required()->type_name(""), choices);
    };
    add("NAME", *name, "The property, e.g. Powered", propertyNames);
    add("VALUE", *value, "Its new value", propertyValues);
    return [&options = syntax.options, name, value] { setProperty(options, *name, *value); };
}

} // namespace

const Verb adapterVerb = {
    "adapter",
    "Adapters",
    "Show an adapter's properties, or set one",
    "kesbt adapter\nkesbt --adapter hci1 adapter info --json\n"
    "kesbt adapter set Discoverable true",
    {{Limit::Whole, noArguments(showAdapter)},
     {"info", "Show all properties (also without this word)", Limit::Whole,
      noArguments(showAdapter)},
     {"set", "Set a property and show its old and new value", Limit::Steps, buildSet}}};

} // namespace Kesbt
