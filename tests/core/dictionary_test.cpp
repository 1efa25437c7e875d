// How property dictionaries and values are decoded.

#include "support/core_test.h"

#include <bluetooth/dict_codec.h>

#include <limits>

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

} // namespace

class DictionaryTest : public CoreTest {
protected:
    int read(const Writer::Build& arguments, Dict& dict) {
        peer.reply("GetProperties", arguments);
        proxy.resetError();
        EXPECT_EQ(call("GetProperties"), 0);
        const int result = proxy.getReplyValue(dict);
        const int number = proxy.getErrorNumber();
        Dict none;
        EXPECT_EQ(proxy.getReplyValue(none), -1); // whatever came of it, the reply is gone
        EXPECT_EQ(proxy.getErrorNumber(), 2);
        errorNumber = number;
        return result;
    }

    int errorNumber = 0;
};

TEST_F(DictionaryTest, ValuesAreKeptInOrderWithTheirAlternatives) {
    Dict dict{{"before", Variant(1u)}};
    EXPECT_EQ(read(
                  [](Writer& w) {
                      w.dict("sv", [](Writer& d) {
                          d.entry("Address", Var{"00:11"});
                          d.entry("Adapter", Var{Path{"/hci0"}});
                          d.entry("Class", Var{std::numeric_limits<std::uint32_t>::max()});
                          d.entry("Vendor", Var{std::uint16_t{65535}});
                          d.entry("RSSI", Var{std::int16_t{-60}});
                          d.entry("Lowest", Var{std::numeric_limits<std::int16_t>::min()});
                          d.entry("Paired", Var{true});
                          d.entry("Paired", Var{false});
                          d.entryWith("UUIDs", [](Writer& e) {
                              e.variant("as", [](Writer& v) {
                                  v.array("s", [](Writer& a) { a("a1")("b2"); });
                              });
                          });
                          d.entryWith("Devices", [](Writer& e) {
                              e.variant("ao", [](Writer& v) {
                                  v.array("o", [](Writer& a) { a(Path{"/dev"}); });
                              });
                          });
                          d.entryWith("Numbers", [](Writer& e) {
                              e.variant("au", [](Writer& v) { v.array("u"); });
                          });
                      });
                  },
                  dict),
              0);
    EXPECT_EQ(errorNumber, 0);
    EXPECT_EQ(described(dict),
              "Address=3:00:11;Adapter=3:/hci0;Class=0:4294967295;Vendor=1:65535;RSSI=5:-60;"
              "Lowest=5:-32768;Paired=2:1;Paired=2:0;UUIDs=4:[a1, b2];Devices=4:[/dev];"
              "Numbers=4:[];");
}

TEST_F(DictionaryTest, NumberedKeysAndBareTextsAreUnderstood) {
    Dict dict;
    EXPECT_EQ(read([](Writer& w) { w.dict("us", [](Writer& d) { d.entry(65536u, "<record/>"); }); },
                   dict),
              0);
    EXPECT_EQ(described(dict), "65536=3:<record/>;");
    EXPECT_EQ(
        read([](Writer& w) { w.dict("uv", [](Writer& d) { d.entry(7u, Var{true}); }); }, dict), 0);
    EXPECT_EQ(described(dict), "7=2:1;");
    EXPECT_EQ(read([](Writer& w) { w.dict("sv"); }, dict), 0);
    EXPECT_TRUE(dict.empty());
}

TEST_F(DictionaryTest, AnEmptyNameEndsTheDictionaryWithSuccess) {
    Dict dict;
    EXPECT_EQ(read(
                  [](Writer& w) {
                      w.dict("sv", [](Writer& d) {
                          d.entry("a", Var{1u}).entry("b", Var{2u});
                          d.entry("", Var{std::int32_t{3}}).entry("c", Var{4.0});
                      });
                  },
                  dict),
              0);
    EXPECT_EQ(described(dict), "a=0:1;b=0:2;");
    EXPECT_EQ(errorNumber, 0);
}

TEST_F(DictionaryTest, DecodingStopsAtTheFirstBadEntryAndKeepsThoseBefore) {
    const auto afterOne = [](const Writer::Build& bad) {
        return [bad](Writer& w) {
            w.dict("sv", [&](Writer& d) {
                d.entry("good", Var{1u});
                d.entryWith("bad", bad);
                d.entry("never", Var{2u});
            });
        };
    };
    const Writer::Build values[] = {
        [](Writer& e) { e(Var{std::int32_t{1}}); },
        [](Writer& e) { e(Var{std::int64_t{1}}); },
        [](Writer& e) { e(Var{std::uint64_t{1}}); },
        [](Writer& e) { e(Var{1.5}); },
        [](Writer& e) { e(Var{std::uint8_t{1}}); },
        [](Writer& e) { e(Var<Var<const char*>>{{"nested"}}); },
        [](Writer& e) {
            e.variant("ay", [](Writer& v) { v.array("y", [](Writer& a) { a(std::uint8_t{1}); }); });
        },
        [](Writer& e) {
            e.variant("a{sv}",
                      [](Writer& v) { v.dict("sv", [](Writer& d) { d.entry("x", Var{1u}); }); });
        },
    };
    Dict dict;
    for (const auto& value : values) {
        EXPECT_EQ(read(afterOne(value), dict), -1);
        EXPECT_EQ(errorNumber, 4);
        EXPECT_EQ(described(dict), "good=0:1;");
    }
    const Writer::Build badNamesOrValues[] = {
        [](Writer& w) { w.dict("ov", [](Writer& d) { d.entry(Path{"/a"}, Var{1u}); }); },
        [](Writer& w) { w.dict("iv", [](Writer& d) { d.entry(std::int32_t{1}, Var{1u}); }); },
        [](Writer& w) { w.dict("su", [](Writer& d) { d.entry("a", 1u); }); }, // not in a variant
    };
    for (const auto& reply : badNamesOrValues) {
        EXPECT_EQ(read(reply, dict), -1);
        EXPECT_EQ(errorNumber, 4);
        EXPECT_TRUE(dict.empty());
    }
}

TEST_F(DictionaryTest, WhatIsNoDictionaryLeavesTheOldEntries) {
    const Writer::Build replies[] = {
        {},
        [](Writer& w) { w("text"); },
        [](Writer& w) { w.array("s"); },
        [](Writer& w) { w(Var{1u}); },
    };
    for (const auto& reply : replies) {
        Dict dict{{"old", Variant(1u)}};
        EXPECT_EQ(read(reply, dict), -1);
        EXPECT_EQ(errorNumber, 5);
        EXPECT_EQ(described(dict), "old=0:1;");
    }
    EXPECT_EQ(call("NoSuchMethod"), -1);
    Dict dict;
    EXPECT_EQ(proxy.getReplyValue(dict), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "Reply message is null");
}

TEST_F(DictionaryTest, AFailedValueKeepsWhatTheEntryHeld) {
    MessagePtr message(dbus_message_new_signal(peerPath, peerInterface, "Changed"));
    Writer(message.get())(Path{"/name"})(Var{1.5})("text");
    DBusMessageIter iter;
    ASSERT_TRUE(dbus_message_iter_init(message.get(), &iter));
    DictEntry entry{"old", Variant(std::string("value"))};
    EXPECT_EQ(proxy.parseEntryName(iter, entry), -1);
    dbus_message_iter_next(&iter);
    EXPECT_EQ(proxy.parseEntryValue(iter, entry), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "Invalid reply value");
    EXPECT_EQ(described({entry}), "old=3:value;");
    dbus_message_iter_next(&iter);
    EXPECT_EQ(proxy.parseEntryValue(iter, entry), 0);
    EXPECT_EQ(described({entry}), "old=3:text;");
}

} // namespace Bluetooth::Test
