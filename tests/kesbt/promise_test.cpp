// What the help and docs/kesbt.md promise: that the examples work, and the members of the JSON
// documents. The host's verbs are among them: ctest runs this in a namespace.

#include "kesbt/kesbt_test.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

namespace Bluetooth::Test {

namespace {

constexpr const char* example = "00:11:22:33:44:55"; // the device of the help's examples

bool has(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

class Promises : public HostTest {
protected:
    Promises() {
        mkfifo("/tmp/kes_bluetooth_autoconnect", 0600); // somebody takes commands
        m_commands = open("/tmp/kes_bluetooth_autoconnect", O_RDWR | O_NONBLOCK);
    }
    ~Promises() override { close(m_commands); }

    PrivateBus session{PrivateBus::Kind::Session, SESSION_BUS_CONFIGURATION};

private:
    int m_commands = -1;
};

/// The lines between the line `heading` and the next empty one, without their first two blanks.
std::vector<std::string> section(const std::string& help, const std::string& heading) {
    std::vector<std::string> lines;
    std::istringstream stream(help);
    std::string line;
    while (std::getline(stream, line) && line != heading) {
    }
    while (std::getline(stream, line) && !line.empty())
        lines.push_back(line.substr(2));
    return lines;
}

/// Brings about what an example takes for granted.
void prepare(const std::string& line) {
    const bool isNew = has(line, " create ") || has(line, " pair ") || has(line, " paired ");
    run({isNew ? "remove" : "create", example});
    if (has(line, " paired "))
        run({"pair", example});
    if (has(line, " volume ") || has(line, " connected "))
        run({"audio", "connect", example});
}

void expectSuccess(const std::string& line) {
    const bool isStream = has(line, " monitor") || has(line, " agent") || has(line, " discover") ||
                          has(line, " scan watch");
    ChildProcess shell({"sh", "-c", (isStream ? "exec " : "") + line},
                       ChildProcess::Output::Capture);
    if (isStream) {
        EXPECT_NE(shell.readLine(), "") << line;
        shell.signal(SIGINT);
    }
    const Result result = finish(shell);
    EXPECT_EQ(result.status, 0) << line << "\n" << result;
}

TEST_F(Promises, TheExamplesInTheHelpWork) {
    setenv("PATH", (std::filesystem::path(KESBT).parent_path().string() + ":/usr/bin").c_str(), 1);
    control("AddDevice", [](Writer& w) {
        w(example).dict("sv", [](Writer& d) {
            d.entry("Behaviour", Var{"JustWorks"});
            d.entry("UUIDs", Var{"110b;110c;110e"});
        });
    });
    std::vector<std::string> verbs = {"adapter set"};
    for (const char* group : {"General:", "Adapters:", "Devices:", "Pairing:", "Audio:", "Host:"}) {
        for (const std::string& line : section(run({"--help"}).out, group))
            verbs.push_back(line.substr(0, line.find(' ')));
    }
    EXPECT_EQ(verbs.size(), 21U);
    for (const std::string& verb : verbs) {
        const Result help = runCommand({"sh", "-c", "kesbt " + verb + " --help"});
        const auto examples = section(help.out, "Examples:");
        EXPECT_FALSE(examples.empty()) << help;
        if (verb == "name" || verb == "restart-daemon" || verb == "cancel")
            continue; // they need hardware, or something that another program does
        for (const std::string& line : examples) {
            prepare(line);
            expectSuccess(line);
        }
    }
}

/// The members of a document and their types, as the documentation writes them.
std::string shape(const Json& value, const std::string& member = "") {
    static const std::set<std::string> ofDaemon = {"properties", "audio", "sink", "control"};
    if (ofDaemon.count(member) != 0 && value.is_object())
        return "{…}";
    if (member == "old" || member == "new")
        return "value";
    if (member == "arguments" && value.is_array())
        return "[value]";
    if (value.is_array()) {
        std::set<std::string> elements;
        for (const Json& element : value)
            elements.insert(shape(element));
        if (elements.empty())
            elements.insert("text"); // the daemon's empty lists would hold texts
        return elements.size() == 1 ? "[" + *elements.begin() + "]" : "mixed";
    }
    if (value.is_object()) {
        std::string text;
        for (const auto& [name, inner] : value.items())
            text += (text.empty() ? "" : ", ") + name + ": " + shape(inner, name);
        return "{" + text + "}";
    }
    return value.is_string() ? "text" : value.is_boolean() ? "boolean" : value.type_name();
}

/// The lines of the documentation's tables that tell a shape.
class Document {
public:
    Document() {
        std::ifstream file(KESBT_DOCUMENT);
        for (std::string line; std::getline(file, line);) {
            if (has(line, "| `{") || has(line, "| `["))
                m_lines.push_back(line);
        }
    }
    /// One line has all that identifies the document, and its shape.
    void expect(const std::vector<std::string>& words, const Json& actual) {
        const std::string told = "| `" + shape(actual) + "` |";
        for (const std::string& line : m_lines) {
            bool isIt = has(line, told);
            for (const std::string& word : words)
                isIt = isIt && has(line.substr(0, line.find(told)), word);
            if (isIt) {
                m_met.insert(line);
                return;
            }
        }
        ADD_FAILURE() << testing::PrintToString(words) << " is not documented as " << told;
    }
    std::vector<std::string> unmet() const {
        std::vector<std::string> lines;
        for (const std::string& line : m_lines) {
            if (m_met.count(line) == 0)
                lines.push_back(line.substr(0, line.find(" | `{")));
        }
        return lines;
    }

private:
    std::vector<std::string> m_lines;
    std::set<std::string> m_met;
};

TEST_F(Promises, JsonHasTheDocumentedMembers) {
    Document document;
    const auto expect = [&document](Arguments arguments) {
        std::string verb;
        for (const std::string& word : arguments) {
            if (word.find_first_of("0123456789P") != std::string::npos)
                break;
            verb += (verb.empty() ? "" : " ") + word;
        }
        arguments.emplace_back("--json");
        const Result result = run(arguments);
        EXPECT_EQ(result.status, 0) << result;
        document.expect({"`" + verb + "`"}, result.json());
        return result.json();
    };
    const auto expectEvent = [&document](const std::string& verb, ChildProcess& stream,
                                         const std::string& event) {
        Json line = awaitEvent(stream, "event", event);
        document.expect({"`" + verb + "`", "`" + event + "`"}, line);
        return line;
    };
    const auto change = [this](const char* key, const auto& value) {
        control("SetDevice", [&](Writer& w) {
            w(gps).dict("sv", [&](Writer& d) { d.entry(key, Var{value}); });
        });
    };
    const auto monitor = start({"monitor", "--json"});
    expectEvent("monitor", *monitor, "daemon-came");
    const auto agent = start({"agent", "--json"});
    expectEvent("agent", *agent, "registered");
    control("StartIncomingPairing", [](Writer& w) { w("hci0")(phone); });
    expectEvent("agent", *agent, "request");
    expectEvent("monitor", *monitor, "signal");

    document.expect({"| an adapter"}, expect({"adapter"})["properties"]);
    document.expect({"| a known device"}, expect({"device", mouse})["properties"]);
    for (const char* verb : {"discover", "scan watch"}) {
        ChildProcess stream({"sh", "-c", std::string("exec " KESBT " --json ") + verb},
                            ChildProcess::Output::Capture);
        const Json found = expectEvent(verb, stream, "found");
        if (found["properties"].contains("Name"))
            document.expect({"| a found device"}, found["properties"]);
        awaitEvent(stream, "address", gps);
        change("RSSI", std::int32_t{-20});
        expectEvent(verb, stream, "changed");
        change("Present", false);
        expectEvent(verb, stream, "vanished");
        change("RSSI", std::int32_t{-70});
        change("Present", true);
    }
    using List = std::vector<Arguments>;
    for (const Arguments& arguments : List{{"names"},
                                           {"adapters"},
                                           {"adapter", "info"},
                                           {"adapter", "set", "Pairable", "on"},
                                           {"scan", "list"},
                                           {"scan", "stop"},
                                           {"devices"},
                                           {"create", headset},
                                           {"services", headset},
                                           {"audio", "connect", headset},
                                           {"audio", "status", headset},
                                           {"volume", "up", headset},
                                           {"volume", "down", headset},
                                           {"wait", "connected", headset},
                                           {"audio", "disconnect", headset},
                                           {"remove", headset},
                                           {"pair", headset},
                                           {"wait", "paired", headset},
                                           {"wait", "found", headset},
                                           {"wait", "powered"},
                                           {"autoconnect", "add", headset},
                                           {"autoconnect", "add", mouse},
                                           {"autoconnect", "enable"},
                                           {"autoconnect", "show"},
                                           {"autoconnect", "list"},
                                           {"autoconnect", "targets"},
                                           {"autoconnect", "disable"},
                                           {"autoconnect", "remove", mouse},
                                           {"autoconnect", "reload"},
                                           {"autoconnect", "pause"},
                                           {"autoconnect", "resume"}})
        expect(arguments);

    daemon->kill();
    expectEvent("monitor", *monitor, "daemon-gone");
    RawPeer willing(bus.address(), "org.bluez"); // bluetoothd lets only the one that began it
    willing.reply("DefaultAdapter", [](Writer& w) { w(Path{"/org/bluez/1/hci0"}); });
    willing.reply("CancelDeviceCreation");
    expect({"cancel", headset});
    EXPECT_EQ(document.unmet(), (Arguments{"| `name`", "| `restart-daemon`"}));
}

} // namespace

} // namespace Bluetooth::Test
