// SPDX-License-Identifier: LGPL-2.1-or-later
// What the help and docs/kesbt.md promise: that the examples work, and the members of the JSON
// documents. The host's verbs are among them: ctest runs this in a namespace.

#include "kesbt/kesbt_test.h"

#include <csignal>
#include <iterator>
#include <regex>
#include <set>
#include <sstream>

namespace Bluetooth::Test {

namespace {

class Promises : public HostTest {
protected:
    Promises() {
        const std::string folder = std::filesystem::path(KESBT).parent_path();
        setenv("PATH", (folder + ":/usr/bin").c_str(), 1);
    }

    PrivateBus session{PrivateBus::Kind::Session, SESSION_BUS_CONFIGURATION};
    PipeReader reader{commandPipe}; // an auto-connect daemon's
};

Texts linesOf(const std::string& command) {
    std::istringstream output(runShell(command).out);
    Texts lines;
    for (std::string line; std::getline(output, line);)
        lines.push_back(line);
    return lines;
}

/// Brings about what an example takes for granted, and runs it.
void expectSuccess(const std::string& example) {
    const auto has = [&](const char* words) {
        return std::regex_search(example, std::regex(words));
    };
    run((has(" (create|pair|paired) ") ? "remove "s : "create "s) + newDevice);
    if (has(" paired "))
        run("pair "s + newDevice);
    if (has(" (volume|connected|headset) "))
        run("audio connect "s + newDevice);
    const bool isStream = has(" (monitor|agent|discover|scan watch|serial connect)");
    ChildProcess shell({"sh", "-c", (isStream ? "exec " : "") + example},
                       ChildProcess::Output::Capture);
    if (isStream) {
        EXPECT_NE(shell.readLine(), "") << example;
        shell.signal(SIGINT);
    }
    const Result result = shell.finish();
    EXPECT_EQ(result.status, 0) << example << "\n" << result;
}

TEST_F(Promises, TheExamplesInTheHelpWork) {
    simulation.control("AddDevice",
                       with(newDevice, Settings{{"Behaviour", "JustWorks"},
                                                {"UUIDs", "1101;1108;110b;110c;110e;1124"}}));
    Texts verbs = linesOf("kesbt --help | sed -nE 's/^  ([a-z][a-z-]*)  +[A-Z].*/\\1/p'");
    EXPECT_GT(verbs.size(), 15U);
    verbs.insert(verbs.end(), {"adapter set", "device set"});
    for (const std::string& verb : verbs) {
        const Texts examples =
            linesOf("kesbt " + verb + " --help | sed -n '/^Examples:/,/^$/s/^  //p'");
        EXPECT_FALSE(examples.empty()) << verb;
        if (verb == "name" || verb == "restart-daemon" || verb == "cancel" || verb == "network")
            continue; // they need hardware, another daemon, or what another program does
        for (const std::string& example : examples)
            expectSuccess(example);
    }
}

/// The members of a document and their types, as the documentation writes them.
std::string shape(const Json& value, const std::string& member = "") {
    static const std::set<std::string> ofDaemon = {"properties", "audio",   "sink", "control",
                                                   "headset",    "network", "input"};
    if (ofDaemon.count(member) != 0 && value.is_object())
        return "{…}";
    if (member == "old" || member == "new")
        return "value";
    if (member == "arguments")
        return "[value]";
    if (value.is_array()) {
        std::set<std::string> elements;
        for (const Json& element : value)
            elements.insert(shape(element));
        if (elements.empty())
            elements.insert("string"); // the daemon's empty lists would hold strings
        return elements.size() == 1 ? "[" + *elements.begin() + "]" : "mixed";
    }
    if (!value.is_object())
        return value.type_name();
    std::string members;
    for (const auto& [name, inner] : value.items())
        members += (members.empty() ? "" : ", ") + name + ": " + shape(inner, name);
    return "{" + members + "}";
}

/// The rows of the documentation's tables that tell a shape.
class Document {
public:
    /// There is a row with this in front of the shape.
    void expect(const std::string& cells, const Json& value) {
        const std::string row = "\n| " + cells + " | `" + shape(value) + "` |\n";
        EXPECT_NE(m_text.find(row), std::string::npos) << "docs/kesbt.md has no row:" << row;
        m_met.insert(row);
    }
    /// The documents of all these commands are told in one row.
    void expect(const Texts& commands) {
        std::string cells;
        for (const std::string& command : commands) {
            const std::size_t end = command.find_first_of("0123456789P");
            cells += (cells.empty() ? "`" : ", `") +
                     command.substr(0, end == std::string::npos ? end : end - 1) + "`";
        }
        for (const std::string& command : commands) {
            const Result result = runShell("kesbt --json " + command);
            EXPECT_EQ(result.status, 0) << command << "\n" << result;
            expect(cells, Json::parse(result.out));
        }
    }
    Json expectEvent(const std::string& cells, ChildProcess& stream, const std::string& event) {
        Json line = awaitEvent(stream, "event", event);
        expect(cells, line);
        return line;
    }
    std::size_t unmet() const {
        const std::regex row("\n\\| [^\n]*\\| `[{\\[][^\n]*` \\|(?=\n)");
        const auto rows =
            std::distance(std::sregex_iterator(m_text.begin(), m_text.end(), row), {});
        return static_cast<std::size_t>(rows) - m_met.size();
    }

private:
    const std::string m_text = readFile(KESBT_DOCUMENT);
    std::set<std::string> m_met;
};

TEST_F(Promises, JsonHasTheDocumentedMembers) {
    Document document;
    const auto monitor = start("monitor --json");
    const std::string comesAndGoes = "`monitor` | `daemon-came`, `daemon-gone`";
    document.expectEvent(comesAndGoes, *monitor, "daemon-came");
    const auto agent = start("agent --json --yes");
    document.expectEvent("`agent` | `registered`", *agent, "registered");
    simulation.control("StartIncomingPairing", with("hci0", phone));
    document.expectEvent("`agent` | `request`", *agent, "request");
    document.expectEvent("`monitor` | `signal`", *monitor, "signal");

    document.expect("an adapter", adapterProperties());
    document.expect("a known device", json("device "s + knownMouse)["properties"]);
    const std::string searches = "`discover`, `scan watch` | ";
    for (const char* verb : {"--json discover", "--json scan watch"}) {
        const auto stream = start(verb);
        document.expectEvent(searches + "`found`, `vanished`", *stream, "found");
        document.expect("a found device", awaitEvent(*stream, "address", headset)["properties"]);
        simulation.setDevice(pinReceiver, "RSSI", "-20");
        document.expectEvent(searches + "`changed`", *stream, "changed");
        simulation.setDevice(pinReceiver, "Present", false);
        document.expectEvent(searches + "`found`, `vanished`", *stream, "vanished");
        simulation.setDevice(pinReceiver, "Present", true);
    }
    const std::string mouse = std::string(" ") + knownMouse;
    const std::string device = std::string(" ") + headset;
    const std::string receiver = std::string(" ") + pinReceiver;
    document.expect({"device" + mouse, "create" + device, "pair" + receiver + " --pin 1234"});
    run("audio connect "s + headset);
    const std::string headsets = "`headset status`, `headset play`, `headset stop`";
    for (const char* verb : {"status", "stop"})
        document.expect(headsets, json("headset "s + verb + device));
    const std::string held = " connect` | `connected`, `disconnected`";
    const auto serial = start("serial connect --json" + receiver);
    document.expectEvent("`serial" + held, *serial, "connected");
    run("autoconnect add "s + knownMouse);
    for (const Texts& commands :
         {Texts{"names"},
          {"adapters"},
          {"adapter", "adapter info"},
          {"adapter set Pairable on"},
          {"device set" + mouse + " Trusted on"},
          {"scan list"},
          {"scan stop"},
          {"services" + device},
          {"volume up" + device, "volume down" + device},
          {"wait found" + device, "wait connected" + device, "wait paired" + mouse, "wait powered"},
          {"audio connect" + device, "audio status" + device, "audio disconnect" + device},
          {"disconnect" + mouse},
          {"input connect" + mouse, "input disconnect" + mouse},
          {"remove" + device},
          {"autoconnect show", "autoconnect disable", "autoconnect enable",
           "autoconnect add" + device, "autoconnect remove" + device},
          {"devices", "autoconnect list", "autoconnect targets"},
          {"autoconnect reload", "autoconnect pause", "autoconnect resume"}})
        document.expect(commands);

    simulation.process().kill();
    document.expectEvent(comesAndGoes, *monitor, "daemon-gone");
    RawPeer willing(simulation.bus().address(), "org.bluez"); // only for who began it
    willing.reply("DefaultAdapter", with(Path{"/org/bluez/1/hci0"}));
    willing.reply("CancelDeviceCreation");
    document.expect({"cancel" + device});
    willing.reply("FindDevice", with(Path{"/org/bluez/1/hci0/dev_1"}));
    willing.reply("GetProperties", [](Writer& w) {
        w.dict("sv", [](Writer& d) { d.entry("Connected", Var{false}); });
    });
    willing.reply("Connect", with("bnep0"));
    willing.reply("Disconnect");
    const auto network = start("network connect --json" + device);
    document.expectEvent("`network" + held, *network, "connected");
    network->signal(SIGINT);
    document.expectEvent("`network" + held, *network, "disconnected");
    document.expect({"network disconnect" + device});
    document.expect("`serial disconnect`", json("serial disconnect" + device + " /dev/rfcomm0"));
    EXPECT_EQ(document.unmet(), 2U) << "but for name and restart-daemon, all rows are shown";
}

TEST_F(Promises, AFailureSaysWhatHelps) {
    const std::string laptop = unreachableLaptop;
    const std::string failed = "org.bluez.Error.Failed";
    const std::string creating = "create " + laptop;
    const std::string notCreated = "cannot create " + laptop + " on hci0: ";
    const std::string toSwitchOn = "switch it on: kesbt --adapter hci1 adapter set Powered true";
    const struct {
        const char* method; // of the adapter or the device, which fails; "" for none
        std::string error;
        std::string text;
        std::string command;
        std::string line;
    } rows[] = {
        {"", "", "", creating,
         notCreated + "Host is down; make sure that the device is on, within reach and not in use "
                      "elsewhere"},
        {"CreateDevice", failed, "Operation canceled", creating,
         notCreated + "Operation canceled; the device does not answer or was disconnected, make "
                      "sure that it is on and within reach"},
        {"CreateDevice", failed, "Operation already in progress", creating,
         notCreated + "Operation already in progress; wait until it is done, then try again"},
        {"CreateDevice", failed, "connect: No route to host (113)", creating,
         notCreated + "connect: No route to host (113); the adapter is off, switch it on: kesbt "
                      "--adapter hci0 adapter set Powered true"},
        {"CreateDevice", "org.bluez.Error.ConnectionAttemptFailed", "Already Exists", creating,
         notCreated + "Already Exists; make sure that the device is on and within reach"},
        {"CreateDevice", "org.freedesktop.DBus.Python.ValueError",
         "Traceback (most recent call last):\n  File \"x.py\", line 1\nValueError: odd. x\n",
         creating, notCreated + "ValueError: odd; see what happens meanwhile with: kesbt monitor"},
        {"CreateDevice", "org.example.Odd", "", creating,
         notCreated + "org.example.Odd; see what happens meanwhile with: kesbt monitor"},
        {"SetProperty", DBUS_ERROR_NO_REPLY, "Did not receive a reply", "adapter set Powered off",
         "cannot set Powered of hci0: Did not receive a reply; the daemon may be busy, try again; "
         "if it hangs, restart it as root: kesbt restart-daemon"},
        {"SetProperty", DBUS_ERROR_NO_REPLY, "Did not receive a reply",
         "--timeout 5 adapter set Powered off",
         "cannot set Powered of hci0 within the time-out; try again or give a longer --timeout"},
        {"", "", "", "adapter set Name \xff",
         "\"\\xff\" is not UTF-8, as names are; write it on a terminal with UTF-8"},
        {"", "", "", "pair "s + phone + " --reject",
         "cannot pair with 00:11:22:33:44:03: it was refused here; repeat the command to answer "
         "otherwise"},
        {"", "", "", "--adapter hci1 scan list", "hci1 is off; " + toSwitchOn},
        {"", "", "", "--adapter hci1 scan watch", "hci1 is off; " + toSwitchOn},
        {"", "", "", "--adapter hci1 discover",
         "cannot start a discovery on hci1: Resource Not Ready; the adapter is off, " + toSwitchOn},
        {"", "", "", "--adapter hci1 device "s + knownMouse,
         "hci1 does not know 00:11:22:33:44:06; see what it knows: kesbt --adapter hci1 devices, "
         "or make it known: kesbt --adapter hci1 create 00:11:22:33:44:06"},
        {"", "", "", "autoconnect enable",
         "there is no /etc/bluetooth for /etc/bluetooth/autoconnect/00:1A:7D:DA:71:10; install "
         "BlueZ 4, or make it as root: mkdir /etc/bluetooth"},
    };
    run("--adapter hci1 adapter set Powered off");
    std::filesystem::remove_all("/etc/bluetooth");
    for (const auto& [method, error, text, command, line] : rows) {
        if (*method)
            simulation.failNext("org.bluez.Adapter", method, error.c_str(), text.c_str());
        const Result result = run(command);
        EXPECT_NE(result.status, 0) << command;
        const std::string errors = "\n" + result.err;
        EXPECT_EQ(errors.substr(errors.rfind('\n', errors.size() - 2) + 1), line + "\n") << command;
    }
}

} // namespace

} // namespace Bluetooth::Test
