// SPDX-License-Identifier: LGPL-2.1-or-later
// The text form of values and dictionaries.

#include <bluetooth/dict_codec.h>

#include "support/latch.h"

#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <tuple>

namespace Bluetooth::Test {

namespace {

Variant text(const char* value) {
    return Variant(std::string(value));
}

/// "name=value;" for each entry, only if all are texts; "null" for none.
std::string parsed(const std::string& input, const std::string& separators) {
    const std::unique_ptr<Dict> dict(stringDivideToDict(input, separators));
    if (!dict)
        return "null";
    std::string result;
    for (const DictEntry& entry : *dict)
        result += entry.first + "=" + boost::get<std::string>(entry.second) + ";";
    return result;
}

const Dict& example() {
    static const Dict dict{{"Address", text("00:11:22:33:44:55")},
                           {"Class", Variant(360u)},
                           {"Paired", Variant(false)},
                           {"UUIDs", Variant(Texts{"a1", "b2"})}};
    return dict;
}

} // namespace

TEST(CodecTest, EveryAlternativeHasItsTextAndOnlyABooleanIsABoolean) {
    const std::pair<Variant, const char*> cases[] = {
        {Variant(), "0"},
        {Variant(std::numeric_limits<std::uint32_t>::max()), "4294967295"},
        {Variant(1u), "1"},
        {Variant(std::uint16_t{65535}), "65535"},
        {Variant(true), "1"},
        {Variant(false), "0"},
        {text("true"), "true"},
        {text("a \"b\"\n;"), "a \"b\"\n;"},
        {Variant(Texts{}), "[]"},
        {Variant(Texts{"1"}), "[1]"},
        {Variant(Texts{"", "a, b"}), "[, a, b]"},
        {Variant(std::numeric_limits<std::int32_t>::min()), "-2147483648"}};
    for (const auto& [value, written] : cases) {
        EXPECT_EQ(variantToString(value), written);
        EXPECT_EQ(variantToBool(value), value == Variant(true));
    }
    EXPECT_EQ(stringArrayToString({"", "a, b"}), "[, a, b]");
}

TEST(CodecTest, DictionariesAreFormattedWithATerminatorAfterEachEntry) {
    const std::string line = "Address: 00:11:22:33:44:55;Class: 360;Paired: 0;UUIDs: [a1, b2];";
    EXPECT_EQ(dictConquerToString(example(), ";"), line);
    EXPECT_EQ(dictToString(example()),
              "Address: 00:11:22:33:44:55\nClass: 360\nPaired: 0\nUUIDs: [a1, b2]\n");
    EXPECT_EQ(dictConquerToString({{"a", text("")}, {"", text("b")}}, "<>"), "a: <>: b<>");
    EXPECT_EQ(dictToString({}), "");
    EXPECT_EQ(dictConquerToString({}, ";"), "");

    // The types do not come back, the text does.
    EXPECT_EQ(parsed(line, ";"), "Address=00:11:22:33:44:55;Class=360;Paired=0;UUIDs=[a1, b2];");
    const std::unique_ptr<Dict> again(stringDivideToDict(line, ";"));
    EXPECT_EQ(dictConquerToString(*again, ";"), line);
    EXPECT_FALSE(variantToBool((*again)[2].second));
}

TEST(CodecTest, ValuesAreFoundByExactNameTheFirstFirst) {
    EXPECT_EQ(find(&example(), "Class"), "360");
    EXPECT_EQ(find(&example(), "class"), "");
    EXPECT_EQ(find(&example(), "Clas"), "");
    EXPECT_EQ(find(nullptr, "x"), "");
    EXPECT_EQ(find(&example(), nullptr), "");
    const Dict twice{{"a", Variant(1u)}, {"a", Variant(2u)}};
    EXPECT_EQ(find(&twice, "a"), "1");
}

TEST(CodecTest, OnlyTerminatedItemsWithAColonAreParsedSplitAtTheFirstAndTrimmed) {
    const std::tuple<std::string, const char*, std::string> cases[] = {
        {"k: v: w;", ";", "k=v: w;"},
        {":v;z:;:;", ";", "=v;z=;=;"},
        {" \t\n\v\f\r a b \t: \v 1 2 \r\n;", ";", "a b=1 2;"},
        {"a: 1;b: 2", ";", "a=1;"},
        {"a: 1", ";", "null"},
        {";;", ";", "null"},
        {"", ";", "null"},
        {"junk;", ";", "null"},
        {"a: 1;", "", "null"},
        {"  x : y ;junk;z:;", ";", "x=y;z=;"},
        {"a: 1\nb: 2;c: 3|", ";\n", "a=1;b=2;"},
        {";a:1;;a:2;", ";", "a=1;a=2;"},
        {std::string("a: \0x;", 6), ";", std::string("a=\0x;", 5)},
    };
    for (const auto& [input, separators, result] : cases)
        EXPECT_EQ(parsed(input, separators), result) << input;

    const std::unique_ptr<DictEntry> entry(stringToEntry("n: -60"));
    ASSERT_TRUE(entry);
    EXPECT_EQ(entry->first, "n");
    EXPECT_TRUE(entry->second == text("-60"));
    EXPECT_EQ(stringToEntry("nocolon"), nullptr);
    EXPECT_EQ(stringToEntry(""), nullptr);
}

} // namespace Bluetooth::Test
