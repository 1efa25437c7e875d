#ifndef KESBLUETOOTH_SERVING_BUS_DICT_BUILDER_H
#define KESBLUETOOTH_SERVING_BUS_DICT_BUILDER_H

#include "serving/bus/glib_ptr.h"

#include <string>
#include <vector>

namespace Bluetooth::Serving {

/// Builds an a{sv} whose entries keep their order.
class DictBuilder {
public:
    DictBuilder() { g_variant_builder_init(&m_builder, G_VARIANT_TYPE("a{sv}")); }
    DictBuilder(const DictBuilder&) = delete;
    DictBuilder& operator=(const DictBuilder&) = delete;
    ~DictBuilder() { g_variant_builder_clear(&m_builder); }

    DictBuilder& add(const char* name, const Value& value) {
        g_variant_builder_add(&m_builder, "{sv}", name, value.get());
        return *this;
    }
    Value end() { return g_variant_builder_end(&m_builder); }

private:
    GVariantBuilder m_builder;
};

/// An array of texts or object paths, typed also when it is empty.
inline Value listValue(const char* elementType, const std::vector<std::string>& texts) {
    GVariantBuilder builder;
    const std::string type = std::string("a") + elementType;
    g_variant_builder_init(&builder, G_VARIANT_TYPE(type.c_str()));
    for (const std::string& text : texts)
        g_variant_builder_add(&builder, elementType, text.c_str());
    return g_variant_builder_end(&builder);
}

inline Value pathValue(const std::string& path) {
    return g_variant_new_object_path(path.c_str());
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

/// One value as the only result or argument.
inline Value tuple(const Value& only) {
    GVariant* child = only.get();
    return g_variant_new_tuple(&child, 1);
}

} // namespace Bluetooth::Serving

#endif
