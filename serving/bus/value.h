// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_VALUE_H
#define KESBLUETOOTH_SERVING_BUS_VALUE_H

#include "serving/bus/glib_ptr.h"

#include <string>
#include <type_traits>
#include <vector>

namespace Bluetooth::Serving {

/// A value of any D-Bus type, or nothing. What C++ has a type for becomes one by itself.
class Value {
public:
    Value() = default;
    /// Takes a floating reference over, or shares a full one.
    Value(GVariant* variant) : m_variant(variant ? g_variant_ref_sink(variant) : nullptr) {}
    Value(const char* string) : Value(g_variant_new_string(string)) {}
    Value(const std::string& string) : Value(string.c_str()) {}
    Value(guint8 number) : Value(g_variant_new_byte(number)) {}
    Value(gint16 number) : Value(g_variant_new_int16(number)) {}
    Value(guint16 number) : Value(g_variant_new_uint16(number)) {}
    Value(guint32 number) : Value(g_variant_new_uint32(number)) {}
    /// A template, since every pointer would become a bool else.
    template <class T, std::enable_if_t<std::is_same_v<T, bool>, int> = 0>
    Value(T flag) : Value(g_variant_new_boolean(flag ? TRUE : FALSE)) {}

    Value(const Value& other) : m_variant(other ? g_variant_ref(other.get()) : nullptr) {}
    Value(Value&& other) noexcept = default;
    Value& operator=(Value other) noexcept {
        m_variant.swap(other.m_variant);
        return *this;
    }
    ~Value() = default;

    GVariant* get() const { return m_variant.get(); }
    explicit operator bool() const { return m_variant != nullptr; }
    bool is(const char* type) const {
        return m_variant && g_variant_is_of_type(m_variant.get(), G_VARIANT_TYPE(type));
    }

    /// What it holds; it has to be of that type.
    bool flag() const { return g_variant_get_boolean(get()) != FALSE; }
    guint32 number() const { return g_variant_get_uint32(get()); }
    std::string text() const { return g_variant_get_string(get(), nullptr); }

private:
    GlibPtr<GVariant> m_variant;
};

inline Value pathValue(const std::string& path) {
    return g_variant_new_object_path(path.c_str());
}

/// A variant that holds a value.
inline Value boxed(const Value& value) {
    return g_variant_new_variant(value.get());
}

/// An array of strings ("s") or object paths ("o"), typed also when it is empty.
inline Value listValue(const char* elementType, const std::vector<std::string>& elements) {
    GVariantBuilder builder;
    const std::string type = std::string("a") + elementType;
    g_variant_builder_init(&builder, G_VARIANT_TYPE(type.c_str()));
    for (const std::string& element : elements)
        g_variant_builder_add(&builder, elementType, element.c_str());
    return g_variant_builder_end(&builder);
}

/// The members of a tuple, or of nothing, as an av.
inline Value variantList(const Value& tuple) {
    GVariantBuilder list;
    g_variant_builder_init(&list, G_VARIANT_TYPE("av"));
    for (gsize i = 0; tuple && i < g_variant_n_children(tuple.get()); ++i) {
        const GlibPtr<GVariant> member(g_variant_get_child_value(tuple.get(), i));
        g_variant_builder_add(&list, "v", member.get());
    }
    return g_variant_builder_end(&list);
}

/// The arguments of a call or a signal, or the results of a call.
template <class... Members>
Value tuple(const Members&... members) {
    const Value values[] = {Value(members)...};
    GVariant* children[sizeof...(members)];
    for (std::size_t i = 0; i < sizeof...(members); ++i)
        children[i] = values[i].get();
    return g_variant_new_tuple(children, sizeof...(members));
}

} // namespace Bluetooth::Serving

#endif
