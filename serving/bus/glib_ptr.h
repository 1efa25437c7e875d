// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_GLIB_PTR_H
#define KESBLUETOOTH_SERVING_BUS_GLIB_PTR_H

#include <gio/gio.h>

#include <memory>

namespace Bluetooth::Serving {

struct GlibDeleter {
    void operator()(GVariant* variant) const { g_variant_unref(variant); }
    void operator()(GError* error) const { g_error_free(error); }
    void operator()(GKeyFile* file) const { g_key_file_unref(file); }
    void operator()(GOptionContext* context) const { g_option_context_free(context); }
    void operator()(char* text) const { g_free(text); }
    void operator()(char** texts) const { g_strfreev(texts); }
};

template <class T>
using GlibPtr = std::unique_ptr<T, GlibDeleter>;

struct ObjectDeleter {
    void operator()(gpointer object) const { g_object_unref(object); }
};

template <class T>
using ObjectPtr = std::unique_ptr<T, ObjectDeleter>;

/// A GError out parameter: `someCall(..., error.out())`, then `if (error)`.
class ErrorOut {
public:
    ErrorOut() = default;
    ErrorOut(const ErrorOut&) = delete;
    ErrorOut& operator=(const ErrorOut&) = delete;
    ~ErrorOut() { g_clear_error(&m_error); }

    GError** out() { return &m_error; }
    explicit operator bool() const { return m_error != nullptr; }
    const GError* operator->() const { return m_error; }
    const GError* get() const { return m_error; }

private:
    GError* m_error = nullptr;
};

} // namespace Bluetooth::Serving

#endif
