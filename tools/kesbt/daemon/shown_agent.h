// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_SHOWN_AGENT_H
#define KESBT_DAEMON_SHOWN_AGENT_H

#include "command/verb.h"

#include <bluetooth/agent.h>

#include <dbus/dbus.h>

#include <functional>
#include <memory>
#include <string>

namespace Kesbt {

/// How the agent answers.
struct AgentSettings {
    std::string pin = "5820";
    std::string capability = Bluetooth::Agent::PSZ_DISPLAY_YES_NO;
    int delay = 0; ///< seconds
    bool reject = false;
};

/// The options of the verbs that have an agent.
std::shared_ptr<AgentSettings> addAgentOptions(const Syntax& syntax);

/// What the daemon asked the agent, and the answer.
struct AgentRequest {
    std::string method;  ///< e.g. "RequestPinCode"
    std::string address; ///< of the device; "" where the request is about none
    std::string detail;  ///< the passkey or the service that it is about, or ""
    std::string answer;  ///< e.g. "1234", "accepted", "rejected"

    /// A sentence for people.
    std::string text() const;
};

/// The library's agent, which tells about each request after it was answered. A passkey that the
/// device's user has to type is told too: the library's agent does not show any.
class ShownAgent : public Bluetooth::Agent {
public:
    using Show = std::function<void(const AgentRequest&)>;

    /// Registers the agent's path. A Failure when that is not possible.
    ShownAgent(const AgentSettings& settings, Show show);
    ~ShownAgent() override;

    /// The daemon does not use the agent any more.
    bool isReleased() const { return m_released; }

private:
    static DBusHandlerResult dispatch(DBusConnection* connection, DBusMessage* message,
                                      void* agent);
    DBusHandlerResult handle(DBusConnection* connection, DBusMessage* message);
    std::string answerTo(const std::string& method, DBusHandlerResult result) const;

    const std::string m_capability; // the library keeps only its address
    const Show m_show;
    bool m_released = false;
};

} // namespace Kesbt

#endif
