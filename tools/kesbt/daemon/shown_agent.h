// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_SHOWN_AGENT_H
#define KESBT_DAEMON_SHOWN_AGENT_H

#include "command/verb.h"
#include "wait/questions.h"

#include <bluetooth/agent.h>

#include <dbus/dbus.h>

#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace Kesbt {

/// What the agent answers by itself, each option for its own kind of request. Somebody is asked for
/// the rest.
struct AgentSettings {
    std::optional<std::string> pin;
    std::string capability = Bluetooth::Agent::PSZ_DISPLAY_YES_NO;
    int delay = 0;       ///< seconds, before an answer that nobody is asked for
    bool accept = false; ///< passkeys and services
    bool reject = false; ///< everything but a PIN code that was given

    /// Whether it answers at least some requests where nobody can be asked.
    bool canAnswer() const { return pin || accept || reject || Questions::canAsk(); }
};

/// The options of the verbs that have an agent.
std::shared_ptr<AgentSettings> addAgentOptions(const Syntax& syntax);

/// Where nobody can be asked, e.g. "there is no terminal to ask at; answer with --yes".
std::string nobodyToAsk(const std::string& options);

/// What the daemon asked the agent, and the answer.
struct AgentRequest {
    std::string method;    ///< e.g. "RequestPinCode"
    std::string path;      ///< of the device's object; "" where the request is about none
    std::string address;   ///< of the device; "" in the same case
    std::string detail;    ///< the passkey or the service that it is about, or ""
    std::string answer;    ///< e.g. "1234", "accepted", "rejected"
    bool wasAsked = false; ///< the person at the terminal gave the answer
    std::string advice;    ///< what lets the next such request succeed that was refused; or ""

    /// A sentence for people.
    std::string text() const;
};

/// An agent that answers as its settings say, or as the person at the terminal does, and tells
/// about each request after it was answered. Nobody who dispatches waits for an answer: it is sent
/// by whatever loop attends to questions(). A passkey that the device's user has to type is told
/// too.
class ShownAgent : public Bluetooth::Agent {
public:
    using Show = std::function<void(const AgentRequest&)>;

    /// Registers the agent's path. A Failure when that is not possible.
    /// @param show one call at a time, on the thread that dispatches or the one that attends
    ShownAgent(const AgentSettings& settings, Show show);
    ~ShownAgent() override;

    Questions& questions() { return m_questions; }
    /// The daemon does not use the agent any more.
    bool isReleased() const { return m_released; }

private:
    struct Kind;
    struct Answer;
    struct Pending;

    static const Kind* kindOf(DBusMessage* message);
    static DBusHandlerResult dispatch(DBusConnection* connection, DBusMessage* message,
                                      void* agent);
    DBusHandlerResult handle(DBusConnection* connection, DBusMessage* message);
    DBusHandlerResult tell(AgentRequest request, DBusConnection* connection, DBusMessage* message);
    void decide(const std::shared_ptr<Pending>& pending);
    std::optional<Answer> answerOf(const Kind& kind) const;
    void finish(Pending& pending, const Answer& answer);
    void show(const AgentRequest& request);

    const AgentSettings m_settings; // the library keeps only the address of the capability
    const Show m_show;
    std::mutex m_showing;
    bool m_released = false;
    Questions m_questions;
};

} // namespace Kesbt

#endif
