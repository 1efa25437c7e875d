#ifndef KESBLUETOOTH_TESTS_MESSAGE_WRITER_H
#define KESBLUETOOTH_TESTS_MESSAGE_WRITER_H

#include <dbus/dbus.h>

#include <cstdint>
#include <functional>
#include <string>
#include <type_traits>

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

/// The D-Bus type of a number.
template <class Number>
constexpr const char* numberType() {
    if (std::is_floating_point_v<Number>)
        return "d";
    constexpr const char* types[] = {"y", "q", "u", "t", "", "n", "i", "x"};
    int place = std::is_signed_v<Number> ? 4 : 0;
    for (std::size_t size = sizeof(Number); size > 1; size /= 2)
        ++place;
    return types[place];
}

inline const char* signatureOf(const char*) {
    return "s";
}
inline const char* signatureOf(const std::string&) {
    return "s";
}
inline const char* signatureOf(const Path&) {
    return "o";
}
template <class Value>
const char* signatureOf(const Var<Value>&) {
    return "v";
}
template <class Number>
std::enable_if_t<std::is_arithmetic_v<Number>, const char*> signatureOf(Number) {
    return std::is_same_v<Number, bool> ? "b" : numberType<Number>();
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
    Writer& operator()(bool value) {
        const dbus_bool_t boolean = value;
        return basic(DBUS_TYPE_BOOLEAN, &boolean);
    }
    template <class Number>
    std::enable_if_t<std::is_arithmetic_v<Number>, Writer&> operator()(Number value) {
        return basic(*signatureOf(value), &value);
    }
    template <class Value>
    Writer& operator()(const Var<Value>& variant) {
        return container(DBUS_TYPE_VARIANT, signatureOf(variant.value),
                         [&](Writer& inner) { inner(variant.value); });
    }

    /// An array: array("s", [](Writer& w) { w("a")("b"); }).
    Writer& array(const char* elementSignature, const Build& elements = {}) {
        return container(DBUS_TYPE_ARRAY, elementSignature, elements);
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

/// The arguments of a message as text: s:hci0 o:/org/bluez u:5 v(s:x) a(s:a s:b) e(s:key v(u:1)).
std::string argumentsOf(DBusMessage* message);

} // namespace Bluetooth::Test

#endif
