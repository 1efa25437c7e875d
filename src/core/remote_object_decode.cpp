// SPDX-License-Identifier: LGPL-2.1-or-later
// How replies, signals and variants become values of the library, and back.

#include "core/dbus_ptr.h"
#include "core/proxy_use.h"
#include "core/remote_object_private.h"

#include <cstring>

namespace Bluetooth {

namespace {

template <class Value>
Value basicAt(DBusMessageIter& iter) {
    Value value{};
    dbus_message_iter_get_basic(&iter, &value);
    return value;
}

bool isText(int type) {
    return type == DBUS_TYPE_STRING || type == DBUS_TYPE_OBJECT_PATH;
}

bool isEmptyArray(DBusMessageIter& array) {
    DBusMessageIter first;
    dbus_message_iter_recurse(&array, &first);
    return dbus_message_iter_get_arg_type(&first) == DBUS_TYPE_INVALID;
}

/// The elements must be of a type that is text in libdbus, or none.
template <class Text>
void readTextArray(DBusMessageIter& array, std::vector<Text>& texts) {
    DBusMessageIter element;
    dbus_message_iter_recurse(&array, &element);
    if (dbus_message_iter_get_arg_type(&element) == DBUS_TYPE_INVALID)
        return;
    do
        texts.emplace_back(basicAt<const char*>(element));
    while (dbus_message_iter_next(&element));
}

template <class Wire, class Value>
bool readBasic(DBusMessageIter& iter, int type, Value& value) {
    const bool valid = dbus_message_iter_get_arg_type(&iter) == type;
    if (valid)
        value = static_cast<Value>(basicAt<Wire>(iter));
    return valid;
}

bool readValue(DBusMessageIter& iter, std::string& text) {
    return readBasic<const char*>(iter, DBUS_TYPE_STRING, text);
}

bool readValue(DBusMessageIter& iter, bool& value) {
    return readBasic<dbus_bool_t>(iter, DBUS_TYPE_BOOLEAN, value);
}

bool readValue(DBusMessageIter& iter, unsigned int& value) {
    return readBasic<dbus_uint32_t>(iter, DBUS_TYPE_UINT32, value);
}

bool readValue(DBusMessageIter& iter, unsigned short& value) {
    return readBasic<dbus_uint16_t>(iter, DBUS_TYPE_UINT16, value);
}

bool readValue(DBusMessageIter& iter, std::vector<unsigned char>& bytes) {
    if (dbus_message_iter_get_arg_type(&iter) != DBUS_TYPE_ARRAY)
        return false;
    const bool holdsBytes = dbus_message_iter_get_element_type(&iter) == DBUS_TYPE_BYTE;
    if (!holdsBytes && !isEmptyArray(iter))
        return false;
    DBusMessageIter first;
    dbus_message_iter_recurse(&iter, &first);
    const unsigned char* begin = nullptr;
    int count = 0;
    if (holdsBytes)
        dbus_message_iter_get_fixed_array(&first, &begin, &count);
    bytes.assign(begin, begin + count);
    return true;
}

template <class Text>
bool readValue(DBusMessageIter& iter, std::vector<Text>& texts) {
    if (dbus_message_iter_get_arg_type(&iter) != DBUS_TYPE_ARRAY)
        return false;
    const int element = dbus_message_iter_get_element_type(&iter);
    if (!isText(element) && element != DBUS_TYPE_SIGNATURE && !isEmptyArray(iter))
        return false;
    texts.clear();
    readTextArray(iter, texts);
    return true;
}

bool isDictionary(DBusMessageIter& iter) {
    return dbus_message_iter_get_arg_type(&iter) == DBUS_TYPE_ARRAY &&
           dbus_message_iter_get_element_type(&iter) == DBUS_TYPE_DICT_ENTRY;
}

/// Reads what a variant holds. @return false for a type that Variant has no alternative for
bool readVariant(DBusMessageIter& inner, Variant& value) {
    switch (dbus_message_iter_get_arg_type(&inner)) {
    case DBUS_TYPE_STRING:
    case DBUS_TYPE_OBJECT_PATH:
        value = std::string(basicAt<const char*>(inner));
        return true;
    case DBUS_TYPE_UINT32:
        value = std::uint32_t{basicAt<dbus_uint32_t>(inner)};
        return true;
    case DBUS_TYPE_UINT16:
        value = std::uint16_t{basicAt<dbus_uint16_t>(inner)};
        return true;
    case DBUS_TYPE_INT16: // on purpose there is no alternative of 16 bits with a sign
        value = std::int32_t{basicAt<dbus_int16_t>(inner)};
        return true;
    case DBUS_TYPE_BOOLEAN:
        value = basicAt<dbus_bool_t>(inner) != 0;
        return true;
    case DBUS_TYPE_ARRAY: {
        if (!isText(dbus_message_iter_get_element_type(&inner)) && !isEmptyArray(inner))
            return false;
        std::vector<std::string> texts;
        readTextArray(inner, texts);
        value = std::move(texts);
        return true;
    }
    default:
        return false;
    }
}

/// The D-Bus side of a Variant that can be sent.
class Outgoing : public boost::static_visitor<bool> {
public:
    const char* signature = nullptr; ///< null for what cannot be sent
    int type = DBUS_TYPE_INVALID;
    union {
        dbus_uint32_t number;
        dbus_uint16_t small;
        dbus_bool_t boolean;
        const char* text;
    } value = {0};

    bool operator()(std::uint32_t held) {
        value.number = held;
        return become(DBUS_TYPE_UINT32_AS_STRING);
    }
    bool operator()(std::uint16_t held) {
        value.small = held;
        return become(DBUS_TYPE_UINT16_AS_STRING);
    }
    bool operator()(bool held) {
        value.boolean = held;
        return become(DBUS_TYPE_BOOLEAN_AS_STRING);
    }
    bool operator()(const std::string& held) {
        value.text = held.c_str();
        // libdbus ends the process on a text that is not UTF-8.
        return become(DBUS_TYPE_STRING_AS_STRING) && dbus_validate_utf8(held.c_str(), nullptr);
    }
    bool operator()(const std::vector<std::string>&) { return true; }
    bool operator()(std::int32_t) { return true; }

private:
    bool become(const char* is) {
        signature = is;
        type = is[0];
        return true;
    }
};

} // namespace

int RemoteObject::parseEntryName(DBusMessageIter& iter, DictEntry& entry) {
    switch (dbus_message_iter_get_arg_type(&iter)) {
    case DBUS_TYPE_STRING:
        entry.first = basicAt<const char*>(iter);
        return 0;
    case DBUS_TYPE_UINT32:
        entry.first = std::to_string(basicAt<dbus_uint32_t>(iter));
        return 0;
    default:
        return recordError(errorReplyValue);
    }
}

int RemoteObject::parseEntryValue(DBusMessageIter& iter, DictEntry& entry) {
    switch (dbus_message_iter_get_arg_type(&iter)) {
    case DBUS_TYPE_STRING:
        entry.second = std::string(basicAt<const char*>(iter));
        return 0;
    case DBUS_TYPE_VARIANT: {
        DBusMessageIter inner;
        dbus_message_iter_recurse(&iter, &inner);
        return readVariant(inner, entry.second) ? 0 : recordError(errorReplyValue);
    }
    default:
        return recordError(errorReplyValue);
    }
}

RemoteObject::DictResult RemoteObject::parseDictionary(DBusMessageIter& iter, Dict& dict) {
    if (!isDictionary(iter))
        return DictResult::NoDict;
    dict.clear();
    DBusMessageIter item;
    dbus_message_iter_recurse(&iter, &item);
    if (dbus_message_iter_get_arg_type(&item) == DBUS_TYPE_INVALID)
        return DictResult::Read;
    dict.reserve(16); // what the objects of the Bluetooth daemon have at most
    do {
        DBusMessageIter half;
        dbus_message_iter_recurse(&item, &half);
        DictEntry entry;
        if (parseEntryName(half, entry) != 0)
            return DictResult::BadName;
        if (entry.first.empty())
            return DictResult::Read; // on purpose: an empty name ends the dictionary
        dbus_message_iter_next(&half);
        if (parseEntryValue(half, entry) != 0)
            return DictResult::BadValue;
        dict.push_back(std::move(entry));
    } while (dbus_message_iter_next(&item));
    return DictResult::Read;
}

int RemoteObject::append(const Variant& value) {
    const ProxyUse use(*this);
    Outgoing outgoing;
    const bool valid = boost::apply_visitor(outgoing, value);
    if (!m_message || !valid)
        return recordError(errorAppendIterator);
    if (!outgoing.signature) {
        recordError(errorAppendIterator);
        return 0; // callers that test only the result go on without the argument
    }
    DBusMessageIter arguments;
    DBusMessageIter container;
    dbus_message_iter_init_append(m_message, &arguments);
    if (!dbus_message_iter_open_container(&arguments, DBUS_TYPE_VARIANT, outgoing.signature,
                                          &container))
        return recordError(errorOpenContainer);
    if (!dbus_message_iter_append_basic(&container, outgoing.type, &outgoing.value)) {
        dbus_message_iter_abandon_container(&arguments, &container);
        return recordError(errorAppendIterator);
    }
    if (!dbus_message_iter_close_container(&arguments, &container))
        return recordError(errorAppendIterator);
    return 0;
}

/// Lets go of the held reply. @return it, the caller's; null, recorded, when none is held
/// @param first its first argument, of type DBUS_TYPE_INVALID when it has none
DBusMessage* RemoteObject::takeReply(DBusMessageIter& first) {
    const ProxyUse use(*this);
    if (m_reply)
        dbus_message_iter_init(m_reply, &first);
    else
        recordError(errorNullReply);
    return std::exchange(m_reply, nullptr);
}

template <class Value>
int RemoteObject::readReply(Value& value) {
    DBusMessageIter iter;
    const MessagePtr reply(takeReply(iter));
    if (!reply)
        return -1;
    return readValue(iter, value) ? 0 : recordError(errorReplyValue);
}

int RemoteObject::getReplyValue(std::string& text) {
    return readReply(text);
}

int RemoteObject::getReplyValue(bool& value) {
    return readReply(value);
}

int RemoteObject::getReplyValue(unsigned int& value) {
    return readReply(value);
}

int RemoteObject::getReplyValue(unsigned short& value) {
    return readReply(value);
}

int RemoteObject::getReplyValue(std::vector<unsigned char>& bytes) {
    return readReply(bytes);
}

int RemoteObject::getReplyValue(std::vector<std::string>& texts) {
    return readReply(texts);
}

int RemoteObject::getReplyValue(std::vector<ObjectPath>& paths) {
    return readReply(paths);
}

int RemoteObject::getReplyValue(ObjectPath& path) {
    DBusMessageIter iter;
    const MessagePtr reply(takeReply(iter));
    if (!reply)
        return -1;
    const int type = dbus_message_iter_get_arg_type(&iter);
    const char* error = dbus_message_get_error_name(reply.get()); // null unless it is one
    if (!isText(type)) // on purpose not the error of the other overloads, and the message stays
        return recordDBusError(error, std::string(m_errorText.c_str()).c_str());
    const char* text = basicAt<const char*>(iter);
    path = ObjectPath(text);
    if (type == DBUS_TYPE_OBJECT_PATH)
        return 0;
    // A text where a path was asked for is the service's error message.
    recordDBusError(error, text);
    return -2;
}

int RemoteObject::getReplyValue(Dict& dict) {
    DBusMessageIter iter;
    const MessagePtr reply(takeReply(iter));
    if (!reply)
        return -1;
    const DictResult result = parseDictionary(iter, dict);
    if (result == DictResult::NoDict)
        return recordError(errorReplyFormat);
    return result == DictResult::Read ? 0 : -1;
}

} // namespace Bluetooth
