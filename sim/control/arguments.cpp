// SPDX-License-Identifier: LGPL-2.1-or-later
#include "control/arguments.h"

namespace Bluetooth::Sim {

namespace {

std::string asSetting(GVariant* value) {
    if (g_variant_is_of_type(value, G_VARIANT_TYPE_STRING))
        return g_variant_get_string(value, nullptr);
    if (g_variant_is_of_type(value, G_VARIANT_TYPE_STRING_ARRAY)) {
        const GlibPtr<char*> texts(g_variant_dup_strv(value, nullptr));
        const GlibPtr<char> joined(g_strjoinv(";", texts.get()));
        return joined.get();
    }
    const GlibPtr<char> printed(g_variant_print(value, FALSE));
    return printed.get();
}

} // namespace

Settings settingsOf(const CallPtr& call, gsize index) {
    Settings settings;
    const Value dict = call->argument(index);
    GVariantIter entries;
    g_variant_iter_init(&entries, dict.get());
    const char* key = nullptr;
    GVariant* value = nullptr;
    while (g_variant_iter_loop(&entries, "{&sv}", &key, &value))
        settings.emplace_back(key, asSetting(value));
    return settings;
}

Value bodyOf(const CallPtr& call, gsize index) {
    Value content = call->content(index);
    if (g_variant_is_of_type(content.get(), G_VARIANT_TYPE_TUPLE))
        return content;
    if (!content.is("av"))
        return tuple(content);
    const gsize count = g_variant_n_children(content.get());
    if (count == 0)
        return {};
    GVariantBuilder body;
    g_variant_builder_init(&body, G_VARIANT_TYPE_TUPLE);
    for (gsize i = 0; i < count; ++i) {
        const GlibPtr<GVariant> boxed(g_variant_get_child_value(content.get(), i));
        const GlibPtr<GVariant> argument(g_variant_get_variant(boxed.get()));
        g_variant_builder_add_value(&body, argument.get());
    }
    return g_variant_builder_end(&body);
}

} // namespace Bluetooth::Sim
