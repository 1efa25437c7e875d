// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_CLIENT_AGENT_H
#define KESBLUETOOTH_SIM_DAEMON_CLIENT_AGENT_H

#include "serving.h"
#include "serving/bluez4/capability.h"
#include "serving/bus/bus_connection.h"

#include <string>

namespace Bluetooth::Sim {

/// An agent of a client, as the daemon sees it. It has at most one request open.
class ClientAgent {
public:
    using OnAnswer = BusConnection::AnswerHandler;

    ClientAgent(BusConnection& bus, std::string owner, std::string path, Capability capability);
    ClientAgent(const ClientAgent&) = delete;
    ClientAgent& operator=(const ClientAgent&) = delete;
    ~ClientAgent();

    const std::string& owner() const { return m_owner; }
    const std::string& path() const { return m_path; }
    Capability capability() const { return m_capability; }
    bool busy() const { return m_request != nullptr; }

    /// Asks, and hands the answer on once; results of another signature become an error.
    /// @param timeout  milliseconds
    void ask(const char* member, const Value& arguments, const char* resultSignature, guint timeout,
             OnAnswer onAnswer);
    /// Shows something; whatever the agent answers changes nothing.
    void show(const char* member, const Value& arguments);
    /// Tells the agent that what it is asked or shows is over; an open request is forgotten.
    void cancel();
    /// Tells the agent that it is used no longer.
    void release();
    /// An open request fails, though the agent has not answered.
    void failRequest();

private:
    void forgetRequest();

    BusConnection& m_bus;
    std::string m_owner;
    std::string m_path;
    Capability m_capability;
    GCancellable* m_request = nullptr;
    OnAnswer m_onAnswer;
};

} // namespace Bluetooth::Sim

#endif
