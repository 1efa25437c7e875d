#ifndef KESBLUETOOTH_TESTS_SIM_SIM_TEST_H
#define KESBLUETOOTH_TESTS_SIM_SIM_TEST_H

#include "serving/bus/value.h"
#include "support/simulation.h"

#include <gtest/gtest.h>

#include <condition_variable>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace Bluetooth::Test {

inline constexpr const char* phone = "00:11:22:33:44:55";

/// A client of the simulated daemon that writes down everything that reaches it, in the order of
/// the wire: signals, replies, and the requests to its agent. In what it writes down and returns
/// paths are without the daemon's prefix, the phone's path on hci0 is `phone`, and error names are
/// without "org.bluez.Error.".
///
/// Lines look like "hci0 DeviceCreated phone", "phone Connected=true", "reply create phone",
/// "error create Failed: Host is down" and "agent RequestPinCode phone".
class SimClient {
public:
    SimClient();
    SimClient(const SimClient&) = delete;
    SimClient& operator=(const SimClient&) = delete;
    /// Leaves the bus.
    ~SimClient();

    /// Makes a call of "Interface.Method"; its answer becomes a line with that label.
    /// @param arguments  in GVariant's text form, e.g. "('00:11:22:33:44:55',)"
    void start(const std::string& label, const std::string& method,
               const std::string& arguments = "()");
    /// Makes a call, of the bus's or the control interface as well, and waits for its answer, which
    /// is not written down.
    /// @param path  another than that of the manager, of hci0 or of the phone
    /// @return "reply …" or "error …"
    std::string call(const std::string& method, const std::string& arguments = "()",
                     const std::string& path = "");
    /// The same for the control interface; an error fails the test.
    std::string control(const std::string& method, const std::string& arguments = "()");
    /// Makes a call. @return all lines up to its answer, or to one that begins so; of those before
    /// the call none. The answer's label is "call".
    Texts trace(const std::string& method, const std::string& arguments = "()",
                const std::string& last = "");

    /// What the agent answers to a method: "" for an empty reply, "-" to stay silent,
    /// "!name" for that error, anything else as the arguments of the reply.
    void agentAnswers(const std::string& method, const std::string& answer);

    /// Waits for a line that begins so, after what was taken before, and takes all up to it.
    Texts until(const std::string& beginning);
    /// Takes what came up to now: all that was sent to us before the last call's answer.
    Texts taken();

    /// Where the daemon's paths begin at present, with a slash at the end.
    std::string base();
    std::string uniqueName() const { return g_dbus_connection_get_unique_name(m_connection); }

private:
    using Message = Serving::ObjectPtr<GDBusMessage>;

    static GDBusMessage* onMessage(GDBusConnection* connection, GDBusMessage* message,
                                   gboolean incoming, gpointer data);
    void answerAgentCall(GDBusMessage* call);
    std::string shorten(std::string text);
    std::string print(GVariant* value);
    std::string bodyOf(GDBusMessage* message);
    std::string answer(GDBusMessage* message, const std::string& label);
    std::string signalLine(GDBusMessage* message);
    Message makeCall(const std::string& method, const std::string& arguments,
                     const std::string& path);

    GDBusConnection* m_connection;
    guint m_filter;
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::map<guint32, std::string> m_labels;
    std::map<std::string, std::string> m_agent;
    Texts m_lines;
    std::string m_base;
};

/// The daemon with two adapters and no devices.
class SimTest : public testing::Test {
protected:
    /// Whatever happened, the daemon ends when asked, quietly: a sanitizer's findings show here.
    void TearDown() override;

    /// A device in range.
    /// @param settings  as GVariant text, e.g. "'Behaviour': <'LegacyPin'>"
    void add(const std::string& settings = "", const std::string& address = phone);
    /// The same, known to hci0 and connected; what was written down of it is forgotten.
    void create(const std::string& settings = "");
    void setTimes(const std::string& times) { client->control("SetTimes", "({" + times + "},)"); }
    /// Sets a property of hci0, or with "Device" of the phone. @return what that brought about
    Texts set(const std::string& name, const std::string& value,
              const std::string& interface = "Adapter");
    void registerAgent() { client->call("Adapter.RegisterAgent", agent); }
    /// Another client leaves the bus, and the daemon has been told so.
    void leave(std::unique_ptr<SimClient>& other);

    const std::string byAddress = "('00:11:22:33:44:55',)";
    const std::string onAdapter = "('hci0', '00:11:22:33:44:55')";
    const std::string agent = "(objectpath '/agent', '')";
    const std::string badArguments = "InvalidArguments: Invalid arguments in method call";

    Simulation simulation{"[Times]\nIdleDisconnect=4000000\n"
                          "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\nName=first\n"
                          "[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\nName=second\n"};
    ChildProcess& daemon = simulation.process();
    std::unique_ptr<SimClient> client = std::make_unique<SimClient>();
    const std::string base = client->base();
    const std::string byPath = "(objectpath '" + base + "hci0/dev_00_11_22_33_44_55',)";
};

template <class... Line>
Texts lines(Line... line) {
    return {line...};
}

/// What comes before and after the life of the phone's object.
inline const Texts created{"hci0 DeviceCreated phone", "hci0 Devices=[phone]"};
inline const Texts removed{"hci0 Devices=[]", "hci0 DeviceRemoved phone"};

inline Texts operator+(Texts first, const Texts& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
}

} // namespace Bluetooth::Test

#endif
