#pragma once

#include <gio/gio.h>

#include <memory>
#include <string>

namespace Bluetooth::Sim {

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

/// A variant that takes a floating reference over, or shares a full one.
class Value {
public:
    Value() = default;
    // Implicit: a Value stands wherever GLib's constructors hand over a new variant.
    Value(GVariant* variant) : variant_(variant ? g_variant_ref_sink(variant) : nullptr) {}
    Value(const Value& other) : variant_(other ? g_variant_ref(other.get()) : nullptr) {}
    Value(Value&& other) noexcept = default;
    Value& operator=(Value other) noexcept {
        variant_.swap(other.variant_);
        return *this;
    }
    ~Value() = default;

    GVariant* get() const { return variant_.get(); }
    explicit operator bool() const { return variant_ != nullptr; }
    bool is(const char* type) const {
        return variant_ && g_variant_is_of_type(variant_.get(), G_VARIANT_TYPE(type));
    }

private:
    GlibPtr<GVariant> variant_;
};

inline Value textValue(const std::string& text) {
    return g_variant_new_string(text.c_str());
}

inline Value boolValue(bool value) {
    return g_variant_new_boolean(value ? TRUE : FALSE);
}

/// A GError out parameter: `someCall(..., error.out())`, then `if (error)`.
class ErrorOut {
public:
    ErrorOut() = default;
    ErrorOut(const ErrorOut&) = delete;
    ErrorOut& operator=(const ErrorOut&) = delete;
    ~ErrorOut() { g_clear_error(&error_); }

    GError** out() { return &error_; }
    explicit operator bool() const { return error_ != nullptr; }
    const GError* operator->() const { return error_; }
    const GError* get() const { return error_; }

private:
    GError* error_ = nullptr;
};

} // namespace Bluetooth::Sim
