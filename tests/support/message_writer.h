// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_MESSAGE_WRITER_H
#define KESBLUETOOTH_TESTS_MESSAGE_WRITER_H

#include <dbus/dbus.h>

#include <cstdint>
#include <functional>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace Bluetooth::Test {

/// An object path as an argument.
struct Path {
    std::string text;
};

/// A value wrapped as a D-Bus variant.
template <class Value>
struct Var {
    Value value;
};
template <class Value>
Var(Value) -> Var<Value>;

/// The keys and values of a scenario's device or adapter, as the scenario file writes them.
using Settings = std::vector<std::pair<std::string, std::string>>;

template <class Value>
inline constexpr bool isVariant = false;
template <class Value>
inline constexpr bool isVariant<Var<Value>> = true;

/// The D-Bus type of a value; that of a string of any kind is "s".
template <class Value>
constexpr const char* signatureOf() {
    if (std::is_same_v<Value, bool>)
        return "b";
    if (std::is_floating_point_v<Value>)
        return "d";
    if (!std::is_integral_v<Value>)
        return std::is_same_v<Value, Path> ? "o" : isVariant<Value> ? "v" : "s";
    constexpr const char* types[] = {"y", "q", "u", "t", "", "n", "i", "x"};
    int place = std::is_signed_v<Value> ? 4 : 0;
    for (std::size_t size = sizeof(Value); size > 1; size /= 2)
        ++place;
    return types[place];
}

/// Appends arguments of any type, good or bad: w("hci0")(Path{"/"})(Var{std::int16_t{-60}}).
class Writer {
public:
    using Build = std::function<void(Writer&)>;

    explicit Writer(DBusMessage* message) { dbus_message_iter_init_append(message, &m_iter); }
    Writer(DBusMessage* message, const Build& arguments) : Writer(message) {
        if (arguments)
            arguments(*this);
    }

    Writer& operator()(const char* value) { return basic(DBUS_TYPE_STRING, &value); }
    Writer& operator()(const std::string& value) { return (*this)(value.c_str()); }
    Writer& operator()(const Path& value) {
        const char* text = value.text.c_str();
        return basic(DBUS_TYPE_OBJECT_PATH, &text);
    }
    template <class Number>
    std::enable_if_t<std::is_arithmetic_v<Number>, Writer&> operator()(Number value) {
        const std::conditional_t<std::is_same_v<Number, bool>, dbus_bool_t, Number> sent = value;
        return basic(*signatureOf<Number>(), &sent);
    }
    template <class Value>
    Writer& operator()(const Var<Value>& variant) {
        return container(DBUS_TYPE_VARIANT, signatureOf<Value>(),
                         [&](Writer& inner) { inner(variant.value); });
    }

    /// What another function appends.
    Writer& operator()(const Build& arguments) {
        arguments(*this);
        return *this;
    }
    /// A dictionary of type a{sv} whose values are strings.
    Writer& operator()(const Settings& settings) {
        return dict("sv", [&](Writer& entries) {
            for (const auto& [key, value] : settings)
                entries.entry(key, Var{value});
        });
    }

    /// An array: array("s", [](Writer& w) { w("a")("b"); }).
    Writer& array(const char* elementSignature, const Build& elements = {}) {
        return container(DBUS_TYPE_ARRAY, elementSignature, elements);
    }
    Writer& structure(const Build& members) {
        return container(DBUS_TYPE_STRUCT, nullptr, members);
    }
    /// A variant of any content.
    Writer& variant(const char* signature, const Build& content) {
        return container(DBUS_TYPE_VARIANT, signature, content);
    }
    /// A dictionary, its entries made with entry().
    Writer& dict(const char* keyAndValue, const Build& entries = {}) {
        return array((std::string("{") + keyAndValue + "}").c_str(), entries);
    }
    template <class Key, class Value>
    Writer& entry(const Key& key, const Value& value) {
        return container(DBUS_TYPE_DICT_ENTRY, nullptr, [&](Writer& inner) { inner(key)(value); });
    }
    template <class Key>
    Writer& entryWith(const Key& key, const Build& value) {
        return container(DBUS_TYPE_DICT_ENTRY, nullptr, [&](Writer& inner) { value(inner(key)); });
    }

private:
    Writer() = default;

    Writer& basic(int type, const void* value) {
        dbus_message_iter_append_basic(&m_iter, type, value);
        return *this;
    }
    Writer& container(int type, const char* signature, const Build& content) {
        Writer inner;
        dbus_message_iter_open_container(&m_iter, type, signature, &inner.m_iter);
        if (content)
            content(inner);
        dbus_message_iter_close_container(&m_iter, &inner.m_iter);
        return *this;
    }

    DBusMessageIter m_iter{};
};

/// Appends these: with("hci0", Path{"/"}, true).
template <class... Values>
Writer::Build with(Values... values) {
    return [=]([[maybe_unused]] Writer& writer) { (writer(values), ...); };
}

/// The arguments of a message as text: s:hci0 o:/org/bluez u:5 v(s:x) a(s:a s:b) e(s:key v(u:1)).
std::string argumentsOf(DBusMessage* message);

} // namespace Bluetooth::Test

#endif
