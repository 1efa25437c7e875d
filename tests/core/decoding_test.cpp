// How replies become values of the library.

#include "support/peer_test.h"

#include <bluetooth/dict_codec.h>

#include <limits>
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

} // namespace

class DecodingTest : public CoreTest {
protected:
    /// Holds a reply with these arguments for the proxy.
    void hold(const Writer::Build& arguments) {
        MessagePtr reply(dbus_message_new(DBUS_MESSAGE_TYPE_METHOD_RETURN));
        Writer(reply.get(), arguments);
        ASSERT_EQ(proxy.setReplyMessage(reply.release()), 0);
    }

    /// Reads the held reply and then once more, when none may be left.
    template <class Value>
    int readOnce(Value& value) {
        proxy.resetError();
        const int result = proxy.getReplyValue(value);
        const int number = proxy.getErrorNumber();
        const std::string text = proxy.getErrorMessage();
        Value another{};
        EXPECT_EQ(proxy.getReplyValue(another), -1);
        EXPECT_EQ(proxy.getErrorNumber(), 2);
        EXPECT_EQ(proxy.getErrorMessage(), "Reply message is null");
        readError = {number, text};
        return result;
    }

    std::pair<int, std::string> readError;
    const std::pair<int, std::string> noError{0, ""};
    const std::pair<int, std::string> wrongType{4, "Invalid reply value"};

    int read(const Writer::Build& arguments, Dict& dict) {
        hold(arguments);
        return readOnce(dict);
    }
};

TEST_F(DecodingTest, TextsAndBooleansAreReadFromTheirOwnTypeOnly) {
    std::string text;
    hold([](Writer& w) { w("hello")(5u); }); // what follows the first argument is not looked at
    EXPECT_EQ(readOnce(text), 0);
    EXPECT_EQ(text, "hello");
    EXPECT_EQ(readError, noError);
    for (const bool value : {true, false}) {
        bool read = !value;
        hold([value](Writer& w) { w(value); });
        EXPECT_EQ(readOnce(read), 0);
        EXPECT_EQ(read, value);
    }
    bool flag = true;
    const Writer::Build neither[] = {{},
                                     [](Writer& w) { w(Path{"/"}); },
                                     [](Writer& w) { w(1u); },
                                     [](Writer& w) { w(Var{"text"}); },
                                     [](Writer& w) { w.array("s"); }};
    for (const auto& reply : neither) {
        hold(reply);
        EXPECT_EQ(readOnce(text), -1);
        EXPECT_EQ(readError, wrongType);
        hold(reply);
        EXPECT_EQ(readOnce(flag), -1);
        EXPECT_EQ(readError, wrongType);
    }
    EXPECT_EQ(text, "hello");
    EXPECT_TRUE(flag);
}

TEST_F(DecodingTest, ATextWhereAPathWasAskedForIsTheServicesError) {
    ObjectPath path;
    hold([](Writer& w) { w(Path{"/org/bluez"}); });
    EXPECT_EQ(readOnce(path), 0);
    EXPECT_STREQ(path, "/org/bluez");
    EXPECT_EQ(readError, noError);

    hold([](Writer& w) { w("No such adapter"); });
    EXPECT_EQ(readOnce(path), -2);
    EXPECT_STREQ(path, "No such adapter");
    EXPECT_EQ(readError, std::make_pair(11, std::string("No such adapter")));

    // Of any other type: number 11 as well, and whatever text there was before stays.
    for (const Writer::Build& reply : {Writer::Build(), Writer::Build([](Writer& w) { w(3u); })}) {
        path = ObjectPath("/kept");
        hold(reply);
        EXPECT_EQ(readOnce(path), -1);
        EXPECT_EQ(readError, std::make_pair(11, std::string()));
        EXPECT_STREQ(path, "/kept");
    }
    hold([](Writer& w) { w("older text"); });
    EXPECT_EQ(proxy.getReplyValue(path), -2);
    hold([](Writer& w) { w(true); });
    EXPECT_EQ(proxy.getReplyValue(path), -1);
    EXPECT_EQ(proxy.getErrorMessage(), "older text");
    hold({});
    hold({}); // takes the place of the one before; the proxy's destructor releases this
    EXPECT_EQ(proxy.newMessage("Unsent"), 0);
}

TEST_F(DecodingTest, ListsAreReadFromArraysOfTexts) {
    const std::tuple<Writer::Build, int, Texts> cases[] = {
        {[](Writer& w) { w.array("s", [](Writer& a) { a("a")("")("b"); }); }, 0, {"a", "", "b"}},
        {[](Writer& w) { w.array("o", [](Writer& a) { a(Path{"/a"})(Path{"/"}); }); },
         0,
         {"/a", "/"}},
        {[](Writer& w) { w.array("s"); }, 0, {}},
        {[](Writer& w) { w.array("u"); }, 0, {}}, // empty of whatever type
        {[](Writer& w) { w.dict("sv"); }, 0, {}},
        {[](Writer& w) { w.array("u", [](Writer& a) { a(1u); }); }, -1, {"before"}},
        {[](Writer& w) { w.array("x", [](Writer& a) { a(std::int64_t{-1}); }); }, -1, {"before"}},
        {[](Writer& w) { w.dict("sv", [](Writer& d) { d.entry("a", Var{1u}); }); }, -1, {"before"}},
        {[](Writer& w) { w.array("as", [](Writer& a) { a.array("s"); }); }, -1, {"before"}},
        {[](Writer& w) { w("a"); }, -1, {"before"}},
        {{}, -1, {"before"}},
    };
    for (const auto& [reply, result, list] : cases) {
        Texts texts{"before"};
        hold(reply);
        EXPECT_EQ(readOnce(texts), result);
        EXPECT_EQ(texts, list);
        EXPECT_EQ(readError, result == 0 ? noError : wrongType);
        std::vector<ObjectPath> paths{ObjectPath("before")};
        hold(reply);
        EXPECT_EQ(readOnce(paths), result);
        EXPECT_EQ(Texts(paths.begin(), paths.end()), list);
    }
}

TEST_F(DecodingTest, ValuesAreKeptInOrderWithTheirAlternatives) {
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
    EXPECT_EQ(readError, noError);
    EXPECT_EQ(described(dict),
              "Address=3:00:11;Adapter=3:/hci0;Class=0:4294967295;Vendor=1:65535;RSSI=5:-60;"
              "Lowest=5:-32768;Paired=2:1;Paired=2:0;UUIDs=4:[a1, b2];Devices=4:[/dev];"
              "Numbers=4:[];");
    const std::pair<Writer::Build, const char*> others[] = {
        {[](Writer& w) { w.dict("us", [](Writer& d) { d.entry(65536u, "<record/>"); }); },
         "65536=3:<record/>;"},
        {[](Writer& w) { w.dict("uv", [](Writer& d) { d.entry(7u, Var{true}); }); }, "7=2:1;"},
        {[](Writer& w) { w.dict("sv"); }, ""},
        // An empty name ends the dictionary, whatever follows.
        {[](Writer& w) {
             w.dict("sv", [](Writer& d) {
                 d.entry("a", Var{1u}).entry("b", Var{2u});
                 d.entry("", Var{std::int32_t{3}}).entry("c", Var{4.0});
             });
         },
         "a=0:1;b=0:2;"}};
    for (const auto& [reply, expected] : others) {
        EXPECT_EQ(read(reply, dict), 0);
        EXPECT_EQ(readError, noError);
        EXPECT_EQ(described(dict), expected);
    }
}

TEST_F(DecodingTest, DecodingStopsAtTheFirstBadEntryAndKeepsThoseBefore) {
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
        EXPECT_EQ(readError, wrongType);
        EXPECT_EQ(described(dict), "good=0:1;");
    }
    const Writer::Build badNamesOrValues[] = {
        [](Writer& w) { w.dict("ov", [](Writer& d) { d.entry(Path{"/a"}, Var{1u}); }); },
        [](Writer& w) { w.dict("iv", [](Writer& d) { d.entry(std::int32_t{1}, Var{1u}); }); },
        [](Writer& w) { w.dict("su", [](Writer& d) { d.entry("a", 1u); }); }, // not in a variant
    };
    for (const auto& reply : badNamesOrValues) {
        EXPECT_EQ(read(reply, dict), -1);
        EXPECT_EQ(readError, wrongType);
        EXPECT_TRUE(dict.empty());
    }
}

TEST_F(DecodingTest, WhatIsNoDictionaryLeavesTheOldEntries) {
    const Writer::Build replies[] = {
        {},
        [](Writer& w) { w("text"); },
        [](Writer& w) { w.array("s"); },
        [](Writer& w) { w(Var{1u}); },
    };
    for (const auto& reply : replies) {
        Dict dict{{"old", Variant(1u)}};
        EXPECT_EQ(read(reply, dict), -1);
        EXPECT_EQ(readError, std::make_pair(5, std::string("Invalid reply format")));
        EXPECT_EQ(described(dict), "old=0:1;");
    }
}

TEST_F(DecodingTest, AFailedValueKeepsWhatTheEntryHeld) {
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
