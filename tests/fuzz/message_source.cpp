// SPDX-License-Identifier: LGPL-2.1-or-later
#include "fuzz/message_source.h"

#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <string>

namespace Bluetooth::Fuzz {

namespace {

constexpr int deepest = 4;

/// Any complete type. What BlueZ sends is more likely than the rest.
std::string takeSignature(FuzzedDataProvider& bytes, int depth) {
    constexpr char basics[] = "sousqnbybiuxtdsog";
    std::string basic(1, basics[bytes.ConsumeIntegralInRange<std::size_t>(0, 16)]);
    const int kind = depth < deepest ? bytes.ConsumeIntegralInRange(0, 7) : 0;
    if (kind == 4)
        return "v";
    if (kind == 5)
        return "a" + takeSignature(bytes, depth + 1);
    if (kind == 6)
        return "a{" + basic + takeSignature(bytes, depth + 1) + "}";
    if (kind == 7)
        return "(" + takeSignature(bytes, depth + 1) + basic + ")";
    return basic;
}

void appendBasic(FuzzedDataProvider& bytes, DBusMessageIter& iter, int type) {
    DBusBasicValue value{};
    std::string text;
    if (type == DBUS_TYPE_STRING) {
        text = bytes.ConsumeRandomLengthString(40);
        text.resize(strlen(text.c_str()));
        if (!dbus_validate_utf8(text.c_str(), nullptr))
            text = "?";
    } else if (type == DBUS_TYPE_OBJECT_PATH) {
        text = "/" + bytes.ConsumeRandomLengthString(20);
        if (!dbus_validate_path(text.c_str(), nullptr))
            text = "/";
    } else if (type != DBUS_TYPE_SIGNATURE) {
        value.u64 = bytes.ConsumeIntegral<std::uint64_t>();
    }
    if (type == DBUS_TYPE_BOOLEAN)
        value.bool_val = value.u64 & 1;
    if (dbus_type_is_fixed(type) == 0)
        value.str = text.data();
    dbus_message_iter_append_basic(&iter, type, &value);
}

void appendValue(FuzzedDataProvider& bytes, DBusMessageIter& iter, DBusSignatureIter& signature,
                 int depth);

/// All that a structure or a dictionary entry holds.
void appendFields(FuzzedDataProvider& bytes, DBusMessageIter& iter, DBusSignatureIter& signature,
                  int depth) {
    do
        appendValue(bytes, iter, signature, depth);
    while (dbus_signature_iter_next(&signature));
}

void appendValue(FuzzedDataProvider& bytes, DBusMessageIter& iter, DBusSignatureIter& signature,
                 int depth) {
    const int type = dbus_signature_iter_get_current_type(&signature);
    if (dbus_type_is_basic(type)) {
        appendBasic(bytes, iter, type);
        return;
    }
    DBusMessageIter inside;
    DBusSignatureIter content;
    std::string text;
    if (type == DBUS_TYPE_VARIANT) {
        text = takeSignature(bytes, depth + 1);
        dbus_signature_iter_init(&content, text.c_str());
    } else {
        dbus_signature_iter_recurse(&signature, &content);
        char* element = dbus_signature_iter_get_signature(&content);
        text = element;
        dbus_free(element);
    }
    const bool isTuple = type == DBUS_TYPE_STRUCT || type == DBUS_TYPE_DICT_ENTRY;
    dbus_message_iter_open_container(&iter, type, isTuple ? nullptr : text.c_str(), &inside);
    if (isTuple)
        appendFields(bytes, inside, content, depth);
    else if (type == DBUS_TYPE_VARIANT)
        appendValue(bytes, inside, content, depth + 1);
    else
        for (int count = bytes.ConsumeIntegralInRange(0, 3); count > 0; --count)
            appendValue(bytes, inside, content, depth + 1);
    dbus_message_iter_close_container(&iter, &inside);
}

void formatLine(const char* format, va_list args) {
    char text[256];
    static_cast<void>(vsnprintf(text, sizeof text, format, args));
}

} // namespace

MessagePtr takeMessage(FuzzedDataProvider& bytes, int type, const char* interfaceName,
                       const char* memberName) {
    if (bytes.ConsumeBool()) {
        const std::string raw = bytes.ConsumeRemainingBytesAsString();
        const auto length = static_cast<int>(raw.size());
        return MessagePtr(dbus_message_demarshal(raw.data(), length, nullptr));
    }
    MessagePtr message(dbus_message_new(type));
    dbus_message_set_path(message.get(), path);
    dbus_message_set_interface(message.get(), interfaceName);
    dbus_message_set_member(message.get(), memberName);
    dbus_message_set_reply_serial(message.get(), 1);
    dbus_message_set_serial(message.get(), 1);
    DBusMessageIter iter;
    dbus_message_iter_init_append(message.get(), &iter);
    for (int count = bytes.ConsumeIntegralInRange(0, 3); count > 0; --count) {
        const std::string text = takeSignature(bytes, 0);
        DBusSignatureIter signature;
        dbus_signature_iter_init(&signature, text.c_str());
        appendValue(bytes, iter, signature, 0);
    }
    return message;
}

} // namespace Bluetooth::Fuzz

// What the library logs is formatted, so that it is looked at, and goes nowhere.
extern "C" void syslog(int /*priority*/, const char* format, ...) {
    va_list args;
    va_start(args, format);
    Bluetooth::Fuzz::formatLine(format, args);
    va_end(args);
}
