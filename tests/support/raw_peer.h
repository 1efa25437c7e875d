// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_RAW_PEER_H
#define KESBLUETOOTH_TESTS_RAW_PEER_H

#include "core/dbus_ptr.h"
#include "support/latch.h"
#include "support/message_writer.h"

#include <atomic>
#include <deque>
#include <functional>
#include <future>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace Bluetooth::Test {

/// A method call that a peer has got or a monitor has seen.
struct SeenCall {
    std::string destination;
    std::string path;
    std::string interface;
    std::string member;
    std::string arguments; ///< as argumentsOf() writes them
    bool wantsReply;

    /// "FindDevice s:00:11:22:33:44:55"; with "!" after the member when no reply is wanted.
    std::string text() const;
};

inline MessagePtr replyTo(DBusMessage* call, const Writer::Build& arguments = {}) {
    MessagePtr reply(dbus_message_new_method_return(call));
    Writer(reply.get(), arguments);
    return reply;
}

/// A participant on a bus that does exactly what a test says, malformed messages included. It has
/// a connection and a thread of its own, apart from the library's.
///
/// All members may be used from any thread. Answers are set before the calls come.
class RawPeer {
public:
    using Build = Writer::Build;
    /// Runs on the peer's thread. @return the reply, or null for none
    using Handler = std::function<MessagePtr(DBusMessage* call)>;
    using Observer = std::function<void(DBusMessage* message)>;
    using Task = std::function<void(DBusConnection* connection)>;

    /// Connects, and owns `name` unless it is empty. Throws std::runtime_error when that fails.
    /// @param observer sees each message that comes, on the peer's thread, before anything else
    explicit RawPeer(const std::string& address, const std::string& name = "",
                     Observer observer = {});
    ~RawPeer();
    RawPeer(const RawPeer&) = delete;
    RawPeer& operator=(const RawPeer&) = delete;

    /// What a method is answered from now on, whatever its object and interface; a method that
    /// nothing is said about is unknown.
    void reply(const std::string& member, Build arguments = {},
               Milliseconds delay = Milliseconds(0));
    void replyError(const std::string& member, const char* name, const char* text);
    void neverReply(const std::string& member);
    void handle(const std::string& member, Handler handler, Milliseconds delay = Milliseconds(0));

    void emit(const std::string& path, const std::string& interface, const std::string& member,
              const Build& arguments = {});
    /// The same, and besides straight to each connection of the bus.
    void emitToEach(const std::string& path, const std::string& interface,
                    const std::string& member, const Build& arguments = {});
    /// Calls a method. @return its reply, a D-Bus error among them; null when none came
    std::future<MessagePtr> call(const std::string& destination, const std::string& path,
                                 const std::string& interface, const std::string& member,
                                 const Build& arguments = {}, Milliseconds timeout = patience);
    /// Sends any message; its serial is set by this.
    void send(MessagePtr message);

    /// Runs something on the peer's thread and waits for it. Handlers may do so too.
    void run(const Task& task);
    bool own(const std::string& name);
    void disown(const std::string& name);
    bool hasOwner(const std::string& name);
    /// @return whether the name came to be owned, or not owned, in time
    bool waitForOwner(const std::string& name, bool owned, Milliseconds limit = patience);

    /// From now on only watches what all others say on the bus; calls() then holds their calls.
    void becomeMonitor();

    std::vector<SeenCall> calls() const { return m_calls.events(); }
    /// calls() as texts, without those to the bus itself.
    std::vector<std::string> callTexts() const;
    bool waitForCalls(const std::string& member, std::size_t count,
                      Milliseconds limit = patience) const;
    void forgetCalls() { m_calls.clear(); }
    /// Calls are no longer recorded: there will be very many.
    void stopRecording() { m_recording = false; }
    /// Signals that came for match rules of the peer, as "MEMBER arguments".
    const Recorder<std::string>& signals() const { return m_signals; }
    void addMatch(const std::string& rule);

private:
    using Clock = std::chrono::steady_clock;
    struct Answer {
        Handler handler;
        Milliseconds delay{0};
    };
    struct OwnCall {
        std::promise<MessagePtr> reply;
        Clock::time_point deadline;
    };

    void post(Task task);
    void loop();
    void wait();
    void sendDueReplies();
    void giveUpOwnCalls();
    void takeReply(DBusMessage* message);
    DBusHandlerResult take(DBusMessage* message);
    void answerCall(DBusMessage* message);
    static DBusHandlerResult filter(DBusConnection*, DBusMessage* message, void* peer);

    DBusConnection* m_connection = nullptr;
    int m_wakeFd = -1;
    std::atomic<bool> m_stop{false};
    std::atomic<bool> m_recording{true};
    std::mutex m_mutex; // guards m_tasks and m_answers
    std::deque<Task> m_tasks;
    std::map<std::string, Answer> m_answers;
    std::multimap<Clock::time_point, MessagePtr> m_dueReplies; // of the peer's thread
    std::map<dbus_uint32_t, OwnCall> m_ownCalls;               // by serial; of the peer's thread
    bool m_isMonitor = false;                                  // of the peer's thread
    Observer m_observer;
    Recorder<SeenCall> m_calls;
    Recorder<std::string> m_signals;
    std::thread m_thread;
};

} // namespace Bluetooth::Test

#endif
