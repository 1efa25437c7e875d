#ifndef KESBLUETOOTH_TESTS_SIM_SIM_CLIENT_H
#define KESBLUETOOTH_TESTS_SIM_SIM_CLIENT_H

#include <gio/gio.h>

#include <condition_variable>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <vector>

namespace Bluetooth::Test {

using Lines = std::vector<std::string>;

/// A client of the simulated daemon that writes down everything that reaches it, in the order of
/// the wire: signals, replies, and the requests to its agent.
///
/// Lines look like "hci0 DeviceCreated hci0/dev_…", "dev_… Connected=true", "reply create …",
/// "error create org.bluez.Error.Failed: Host is down" and "agent RequestPinCode hci0/dev_…".
class SimClient {
public:
    SimClient();
    SimClient(const SimClient&) = delete;
    SimClient& operator=(const SimClient&) = delete;
    /// Leaves the bus.
    ~SimClient();

    /// Makes a call; its answer becomes a line with that label.
    /// @param arguments  in GVariant's text form, e.g. "('00:11:22:33:44:55',)"
    void start(const std::string& label, const std::string& path, const std::string& method,
               const std::string& arguments = "()");
    /// Makes a call and waits for its answer, which is not written down.
    /// @return "reply …" or "error …"
    std::string call(const std::string& path, const std::string& method,
                     const std::string& arguments = "()");
    /// The same for the control interface; an error fails the test.
    std::string control(const std::string& method, const std::string& arguments = "()");

    /// Waits until another client has left the bus, and the daemon has been told so.
    void awaitEnd(const std::string& otherName);

    /// What the agent answers to a method: "" for an empty reply, "-" to stay silent,
    /// "!name" for that error, anything else as the arguments of the reply.
    void agentAnswers(const std::string& method, const std::string& answer);

    /// Waits for a line that begins so, after what was taken before, and takes all up to it.
    Lines until(const std::string& beginning);
    /// Takes what came up to now: all that was sent to us before the last call's answer.
    Lines taken();

    /// Where the daemon's paths begin at present, with a slash at the end.
    std::string base();
    std::string uniqueName() const;

private:
    static GDBusMessage* onMessage(GDBusConnection* connection, GDBusMessage* message,
                                   gboolean incoming, gpointer data);
    void answerAgentCall(GDBusMessage* call);
    void add(const std::string& line);
    std::string describe(GDBusMessage* message);
    guint32 send(const std::string& destination, const std::string& path, const std::string& method,
                 const std::string& arguments, const std::string& label);

    GDBusConnection* m_connection;
    guint m_filter;
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::map<guint32, std::string> m_labels;
    std::map<std::string, std::string> m_answers;
    std::map<std::string, std::string> m_agent;
    Lines m_lines;
    unsigned m_calls = 0;
};

} // namespace Bluetooth::Test

#endif
