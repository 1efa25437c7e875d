// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_SIM_SIM_TEST_H
#define KESBLUETOOTH_TESTS_SIM_SIM_TEST_H

#include "support/devices.h"
#include "support/simulation.h"

#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <regex>
#include <string>
#include <utility>
#include <vector>

namespace Bluetooth::Test {

/// What is asked of the daemon: "Interface.Method" and the arguments.
struct Question {
    template <class... Arguments>
    Question(const char* asked, const Arguments&... given)
        : method(asked), arguments(with(given...)) {}

    std::string method;
    Writer::Build arguments;
};

/// A client of the simulated daemon that writes down everything that reaches it, in the order of
/// the wire: signals, answers, and the requests to its agent. In what it writes down and returns
/// paths are without the daemon's prefix, the path of `newDevice` on hci0 is `device`, and error
/// names are without "org.bluez.Error.".
///
/// Lines look like "hci0 DeviceCreated o:device", "device Connected=b:1",
/// "answer CreateDevice o:device", "answer CreateDevice error Failed: Host is down" and
/// "agent RequestPinCode o:device". Of audio the interface is named, not the device:
/// "Sink.Connected", "Audio State=s:connected".
class SimClient {
public:
    SimClient();

    /// Asks; the answer becomes a line.
    void start(const Question& question);
    /// Asks, the bus or the control interface as well, and waits for the answer, which is not
    /// written down.
    /// @param path  another than that of the manager, of hci0 or of the device
    /// @return its arguments, or "error …"
    std::string call(const Question& question, const std::string& path = "");
    /// The same for the control interface; an error fails the test.
    std::string control(Question question);
    /// Asks. @return all lines up to the answer, or to one that begins so; of those before none
    Texts trace(const Question& question, std::string last = "");

    /// Waits for a line that begins so, after what was taken before, and takes all up to it.
    Texts until(const std::string& beginning);
    /// Takes what came up to now: all that was sent to us before the last call's answer.
    Texts taken() { return take(m_lines.count()); }

    /// Where the daemon's paths begin at present, with a slash at the end.
    std::string findBase();
    /// The participant itself. As the agent it says yes to everything until it is told otherwise.
    RawPeer& peer() { return m_peer; }

private:
    struct Callee {
        std::string destination, path, interface, member;
    };

    Callee calleeOf(const Question& question) const;
    std::string shorten(std::string text) const;
    void write(DBusMessage* message);
    Texts take(std::size_t end);

    Recorder<std::string> m_lines;
    std::size_t m_taken = 0;
    std::map<dbus_uint32_t, std::string> m_asked; // methods by serial; of the peer's thread
    std::string m_base;
    // Not made by the peer's thread: two threads cannot compile expressions at once.
    const std::vector<std::pair<std::regex, std::string>> m_replacements{
        {std::regex("/org/bluez/[0-9]+/"), ""},
        {std::regex("(hci0/)?dev_00_11_22_33_44_55"), "device"},
        {std::regex("org\\.bluez\\.Error\\."), ""},
        {std::regex("PropertyChanged s:(\\w+) v\\((.*)\\)$"), "$1=$2"}};
    RawPeer m_peer; // last, since it uses the others to its end
};

/// The daemon with two adapters and no devices.
class TwoAdapters {
protected:
    Simulation simulation{"[Times]\nIdleDisconnect=4000000\n"
                          "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\nName=first\n"
                          "[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\nName=second\n"};
};

/// Each test is a client of it.
class SimTest : public testing::Test, protected TwoAdapters, protected SimClient {
protected:
    /// A device in range.
    void add(const Settings& settings = {}, const char* address = newDevice) {
        control({"AddDevice", address, settings});
    }
    /// The same, known to hci0 and connected; what was written down of it is forgotten.
    void create(const Settings& settings = {});
    void setTime(const char* name, const char* milliseconds) {
        control({"SetTimes", Settings{{name, milliseconds}}});
    }
    /// Sets a property of hci0. @return all that this brought about, after its answer too
    template <class Value>
    Texts set(const char* name, const Value& value) {
        return effectOf({"Adapter.SetProperty", name, Var{value}});
    }
    /// The same for a property of the device.
    template <class Value>
    Texts setOfDevice(const char* name, const Value& value) {
        return effectOf({"Device.SetProperty", name, Var{value}});
    }
    Texts effectOf(const Question& question);
    void registerAgent() { call({"Adapter.RegisterAgent", agent, ""}); }
    /// Another client leaves the bus, and the daemon has been told so.
    void leave(std::unique_ptr<SimClient>& other);

    const std::string base = findBase();
    const Path device{base + "hci0/dev_00_11_22_33_44_55"};
    const Path agent{"/agent"};
};

inline const std::string badArguments = "error InvalidArguments: Invalid arguments in method call";

template <class... Line>
Texts lines(Line... line) {
    return {line...};
}

/// What comes before and after the life of the device's object.
inline const Texts created{"hci0 DeviceCreated o:device", "hci0 Devices=a(o:device)"};
inline const Texts removed{"hci0 Devices=a()", "hci0 DeviceRemoved o:device"};

inline Texts operator+(Texts first, const Texts& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
}

} // namespace Bluetooth::Test

#endif
