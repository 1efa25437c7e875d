// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_DICT_BUILDER_H
#define KESBLUETOOTH_SERVING_BUS_DICT_BUILDER_H

#include "serving/bus/value.h"

#include <optional>

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
    /// Adds nothing when there is no value.
    template <class T>
    DictBuilder& add(const char* name, const std::optional<T>& value) {
        return value ? add(name, Value(*value)) : *this;
    }
    Value end() { return g_variant_builder_end(&m_builder); }

private:
    GVariantBuilder m_builder;
};

} // namespace Bluetooth::Serving

#endif
