// SPDX-License-Identifier: LGPL-2.1-or-later
// How replies become values of the library.

#include "core/message_text.h"
#include "support/peer_test.h"

#include <bluetooth/dict_codec.h>

#include <tuple>

namespace Bluetooth::Test {

namespace {

/// "Name=3:text;" for each entry: the name, the Variant's alternative, the value.
std::string described(const Dict& dict) {
    std::string text;
    for (const DictEntry& entry : dict)
        text += entry.first + "=" + std::to_string(entry.second.which()) + ":" +
                variantToString(entry.second) + ";";
    return text;
}

constexpr const char* success = "0 0 ";
constexpr const char* wrongType = "-1 4 Invalid reply value";

} // namespace

class DecodingTest : public CoreTest {
protected:
    /// Reads a reply as a value, and then once more, when none may be left.
    template <class Value>
    std::string read(const char* reply, Value& value) {
        EXPECT_EQ(proxy.setReplyMessage(replyWith(reply).release()), 0);
        std::string outcome = outcomeOf(proxy, proxy.getReplyValue(value));
        Value another{};
        EXPECT_EQ(outcomeOf(proxy, proxy.getReplyValue(another)), "-1 2 Reply message is null");
        return outcome;
    }
};

TEST_F(DecodingTest, SingleValuesAreReadFromTheirOwnTypeOnly) {
    std::string text;
    EXPECT_EQ(read("('hello', uint32 5)", text), success); // only the first argument is looked at
    bool no = true;
    EXPECT_EQ(read("(false,)", no), success);
    EXPECT_FALSE(no);
    bool yes = false;
    EXPECT_EQ(read("(true,)", yes), success);
    unsigned int large = 0;
    EXPECT_EQ(read("(uint32 4294967295,)", large), success);
    unsigned short small = 0;
    EXPECT_EQ(read("(uint16 65535,)", small), success);
    std::vector<unsigned char> bytes{1};
    EXPECT_EQ(read("(@au [],)", bytes), success); // empty of whatever type
    EXPECT_TRUE(bytes.empty());
    EXPECT_EQ(read("([byte 0, 255],)", bytes), success);
    for (const char* reply :
         {"()", "(objectpath '/',)", "(byte 1,)", "(<'text'>,)", "([objectpath '/'],)"}) {
        EXPECT_EQ(read(reply, text), wrongType) << reply;
        EXPECT_EQ(read(reply, yes), wrongType) << reply;
        EXPECT_EQ(read(reply, large), wrongType) << reply;
        EXPECT_EQ(read(reply, small), wrongType) << reply;
        EXPECT_EQ(read(reply, bytes), wrongType) << reply;
    }
    EXPECT_EQ(text, "hello");
    EXPECT_TRUE(yes);
    EXPECT_EQ(large, 4294967295U);
    EXPECT_EQ(small, 65535U);
    EXPECT_EQ(bytes, (std::vector<unsigned char>{0, 255}));
}

TEST_F(DecodingTest, ATextWhereAPathWasAskedForIsTheServicesError) {
    const std::tuple<const char*, const char*, const char*> cases[] = {
        {"(objectpath '/org/bluez',)", success, "/org/bluez"},
        {"('No such adapter',)", "-2 11 No such adapter", "No such adapter"},
        // Of any other type: number 11 as well, with whatever text there was before.
        {"()", "-1 11 ", "/kept"},
        {"(uint32 3,)", "-1 11 ", "/kept"},
    };
    for (const auto& [reply, outcome, value] : cases) {
        ObjectPath path("/kept");
        EXPECT_EQ(read(reply, path), outcome);
        EXPECT_STREQ(path, value);
    }
    ObjectPath path;
    for (const char* reply : {"('older text',)", "(true,)"}) {
        proxy.setReplyMessage(replyWith(reply).release());
        EXPECT_LT(proxy.getReplyValue(path), 0);
        EXPECT_EQ(proxy.getErrorMessage(), "older text");
        EXPECT_STREQ(proxy.getErrorName(), "");
    }
    // The second takes the place of the first; the proxy's destructor releases it.
    proxy.setReplyMessage(replyWith("()").release());
    proxy.setReplyMessage(replyWith("()").release());
    EXPECT_EQ(proxy.newMessage("Unsent"), 0);
}

TEST_F(DecodingTest, ListsAreReadFromArraysOfTexts) {
    const std::tuple<const char*, const char*, Texts> cases[] = {
        {"(['a', '', 'b'],)", success, {"a", "", "b"}},
        {"([objectpath '/a', '/'],)", success, {"/a", "/"}},
        {"(@as [],)", success, {}},
        {"(@au [],)", success, {}}, // empty of whatever type
        {"(@a{sv} {},)", success, {}},
        {"([uint32 1],)", wrongType, {"before"}},
        {"([int64 -1],)", wrongType, {"before"}},
        {"({'a': <uint32 1>},)", wrongType, {"before"}},
        {"([@as []],)", wrongType, {"before"}},
        {"('a',)", wrongType, {"before"}},
        {"()", wrongType, {"before"}},
    };
    for (const auto& [reply, outcome, list] : cases) {
        Texts texts{"before"};
        EXPECT_EQ(read(reply, texts), outcome) << reply;
        EXPECT_EQ(texts, list);
        std::vector<ObjectPath> paths{ObjectPath("before")};
        EXPECT_EQ(read(reply, paths), outcome) << reply;
        EXPECT_EQ(Texts(paths.begin(), paths.end()), list);
    }
}

TEST_F(DecodingTest, DictionariesAreReadInOrderUpToTheFirstBadEntry) {
    const char* const wrongFormat = "-1 5 Invalid reply format";
    const std::tuple<std::string, const char*, const char*> cases[] = {
        {"({'Address': <'00:11'>, 'Adapter': <objectpath '/hci0'>, 'Class': <uint32 4294967295>,"
         "  'Vendor': <uint16 65535>, 'RSSI': <int16 -60>, 'Lowest': <int16 -32768>,"
         "  'Paired': <true>, 'Paired': <false>, 'UUIDs': <['a1', 'b2']>,"
         "  'Devices': <[objectpath '/dev']>, 'Numbers': <@au []>},)",
         success,
         "Address=3:00:11;Adapter=3:/hci0;Class=0:4294967295;Vendor=1:65535;RSSI=5:-60;"
         "Lowest=5:-32768;Paired=2:1;Paired=2:0;UUIDs=4:[a1, b2];Devices=4:[/dev];Numbers=4:[];"},
        {"({uint32 65536: '<record/>'},)", success, "65536=3:<record/>;"},
        {"({uint32 7: <true>},)", success, "7=2:1;"},
        {"(@a{sv} {},)", success, ""},
        // An empty name ends the dictionary, whatever follows.
        {"({'a': <uint32 1>, 'b': <uint32 2>, '': <int32 3>, 'c': <4.0>},)", success,
         "a=0:1;b=0:2;"},
        {"({objectpath '/a': <uint32 1>},)", wrongType, ""},
        {"({int32 1: <uint32 1>},)", wrongType, ""},
        {"({'a': uint32 1},)", wrongType, ""}, // not in a variant
        // What is no dictionary leaves the old entries.
        {"()", wrongFormat, "old=0:1;"},
        {"('text',)", wrongFormat, "old=0:1;"},
        {"(@as [],)", wrongFormat, "old=0:1;"},
        {"(<uint32 1>,)", wrongFormat, "old=0:1;"},
    };
    for (const auto& [reply, outcome, value] : cases) {
        Dict dict{{"old", Variant(1u)}};
        EXPECT_EQ(read(reply.c_str(), dict), outcome) << reply;
        EXPECT_EQ(described(dict), value) << reply;
    }
    for (const std::string bad : {"int32 1", "int64 1", "uint64 1", "1.5", "byte 1", "<'nested'>",
                                  "[byte 1]", "{'x': <uint32 1>}"}) {
        Dict dict;
        EXPECT_EQ(
            read(("({'good': <uint32 1>, 'bad': <" + bad + ">, 'never': <uint32 2>},)").c_str(),
                 dict),
            wrongType);
        EXPECT_EQ(described(dict), "good=0:1;") << bad;
    }
}

TEST_F(DecodingTest, AFailedValueKeepsWhatTheEntryHeld) {
    const MessagePtr message = replyWith("(objectpath '/name', <1.5>, 'text')");
    DBusMessageIter iter;
    ASSERT_TRUE(dbus_message_iter_init(message.get(), &iter));
    DictEntry entry{"old", Variant(std::string("value"))};
    EXPECT_EQ(proxy.parseEntryName(iter, entry), -1);
    dbus_message_iter_next(&iter);
    EXPECT_EQ(outcomeOf(proxy, proxy.parseEntryValue(iter, entry)), wrongType);
    EXPECT_EQ(described({entry}), "old=3:value;");
    dbus_message_iter_next(&iter);
    EXPECT_EQ(proxy.parseEntryValue(iter, entry), 0);
    EXPECT_EQ(described({entry}), "old=3:text;");
}

} // namespace Bluetooth::Test
