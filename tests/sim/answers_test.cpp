// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

#include <algorithm>
#include <fstream>
#include <ostream>
#include <regex>

namespace Bluetooth::Test {

namespace {

struct Section {
    std::string name;
    Texts rows;
};

void PrintTo(const Section& section, std::ostream* out) {
    *out << section.name;
}

struct Answers {
    std::map<std::string, std::string> errors; ///< texts by names
    std::vector<Section> sections;
};

const Answers& answers() {
    static const Answers read = [] {
        Answers result;
        std::ifstream file(SIM_ANSWERS);
        for (std::string line; std::getline(file, line);) {
            if (line.empty() || line[0] == '#')
                continue;
            if (line[0] == '[')
                result.sections.push_back({line.substr(1, line.size() - 2), {}});
            else if (line[0] == '!')
                result.errors[line.substr(1, line.find(':') - 1)] = line;
            else
                result.sections.back().rows.push_back(line);
        }
        return result;
    }();
    return read;
}

/// Parts between separators that are in no quotes or braces; the quotes go.
Texts split(const std::string& text, char separator) {
    Texts parts{""};
    bool quoted = false;
    int depth = 0;
    for (const char c : text) {
        if (c == '"')
            quoted = !quoted;
        depth += c == '{' ? 1 : c == '}' ? -1 : 0;
        if (c == separator && !quoted && depth == 0)
            parts.emplace_back();
        else if (c != '"' || separator != ' ')
            parts.back() += c;
    }
    return parts;
}

template <class Number>
void appendNumber(Writer& writer, const std::string& value) {
    writer(static_cast<Number>(std::stoll(value)));
}

void append(Writer& writer, const std::string& argument) {
    if (argument[0] == '{') {
        Settings settings;
        for (const std::string& entry : split(argument.substr(1, argument.size() - 2), ' '))
            settings.emplace_back(entry.substr(0, entry.find('=')),
                                  entry.substr(entry.find('=') + 1));
        writer(settings);
        return;
    }
    static const std::map<char, void (*)(Writer&, const std::string&)> types = {
        {'s', [](Writer& w, const std::string& value) { w(value); }},
        {'o', [](Writer& w, const std::string& value) { w(Path{value}); }},
        {'v',
         [](Writer& w, const std::string& value) {
             w.variant(value.substr(0, 1).c_str(),
                       [&](Writer& v) { append(v, value.substr(0, value.size() - 1)); });
         }},
        {'b', appendNumber<bool>},
        {'y', appendNumber<std::uint8_t>},
        {'n', appendNumber<std::int16_t>},
        {'q', appendNumber<std::uint16_t>},
        {'i', appendNumber<std::int32_t>},
        {'u', appendNumber<std::uint32_t>}};
    types.at(argument[0])(writer, argument.substr(2));
}

std::string signatureOf(const Writer::Build& arguments) {
    const MessagePtr message(dbus_message_new(DBUS_MESSAGE_TYPE_SIGNAL));
    Writer(message.get(), arguments);
    return dbus_message_get_signature(message.get());
}

} // namespace

class AnswersTest : public SimTest, public testing::WithParamInterface<Section> {
protected:
    void check(const std::string& row) {
        const std::size_t equals = row.rfind(" = ");
        ASSERT_NE(equals, std::string::npos) << row;
        std::string method;
        for (const std::string& asked : split(row.substr(0, equals), '|'))
            ask(method, asked, withUuids(row.substr(equals + 3)), row);
    }

private:
    /// @param method  the one before, which is used and changed
    void ask(std::string& method, const std::string& asked, std::string expected,
             const std::string& row) {
        Texts words;
        for (const std::string& word : split(asked, ' '))
            if (!word.empty())
                words.push_back(expand(word));
        if (!words.empty() && std::isupper(static_cast<unsigned char>(words[0][0]))) {
            method = words[0];
            words.erase(words.begin());
        }
        const Writer::Build arguments = [words](Writer& writer) {
            for (const std::string& word : words)
                append(writer, word);
        };
        const std::size_t at = std::min(method.find('@'), method.size());
        std::string name = method.substr(0, at);
        std::string path = method.substr(std::min(at + 1, method.size()));
        if (!path.empty() && path[0] != '/')
            path.insert(0, base);
        if (expected[0] == '!')
            expected = errorText(expected.substr(1), name, signatureOf(arguments));
        if (name.rfind("Sim.", 0) == 0)
            name.insert(0, "com.kestrine.bluetooth.");
        std::string answer = call({name.c_str(), arguments}, path);
        const std::size_t kept = expected.rfind("…");
        if (kept != std::string::npos) {
            expected.resize(kept);
            answer.resize(std::min(kept, answer.size()));
        }
        EXPECT_EQ(answer, expected) << asked << " of " << row;
    }

    static std::string withUuids(const std::string& text) {
        static const std::regex uuid("%([0-9a-f]{4})");
        return std::regex_replace(text, uuid, "0000$1-0000-1000-8000-00805f9b34fb");
    }

    std::string expand(std::string word) const {
        for (std::size_t at = 0; (at = word.find('$', at)) != std::string::npos;)
            word.compare(at, 7, "$device") == 0 ? word.replace(at, 7, device.text)
                                                : word.replace(at, 1, base);
        return withUuids(word);
    }

    /// @param error  "Name" for one with a text of its own, or "Name: text"
    static std::string errorText(const std::string& error, const std::string& method,
                                 const std::string& signature) {
        if (error.rfind("Unknown", 0) == 0) {
            const std::size_t dot = method.find('.');
            return "error org.freedesktop.DBus.Error." + error + ": Method \"" +
                   method.substr(dot + 1) + "\" with signature \"" + signature +
                   "\" on interface \"org.bluez." + method.substr(0, dot) + "\" doesn't exist\n";
        }
        const auto& known = answers().errors;
        const auto text = known.find(error);
        return "error " + (text == known.end() ? error : text->second.substr(1));
    }
};

TEST_P(AnswersTest, AreThoseOfTheDaemon) {
    for (const std::string& row : GetParam().rows)
        check(row);
}

INSTANTIATE_TEST_SUITE_P(Sim, AnswersTest, testing::ValuesIn(answers().sections),
                         [](const auto& section) { return section.param.name; });

} // namespace Bluetooth::Test
