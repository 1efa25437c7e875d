// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/client_agent.h"

#include "serving/bluez4/errors.h"
#include "serving/bluez4/interfaces.h"

namespace Bluetooth::Sim {

ClientAgent::ClientAgent(BusConnection& bus, std::string owner, std::string path,
                         Capability capability)
    : m_bus(bus), m_owner(std::move(owner)), m_path(std::move(path)), m_capability(capability) {}

ClientAgent::~ClientAgent() {
    forgetRequest();
}

void ClientAgent::ask(const char* member, const Value& arguments, const char* resultSignature,
                      guint timeout, OnAnswer onAnswer) {
    forgetRequest();
    m_request = g_cancellable_new();
    m_onAnswer = std::move(onAnswer);
    const std::string expected = std::string("(") + resultSignature + ")";
    m_bus.call(m_owner, m_path, Interfaces::agent, member, arguments, static_cast<int>(timeout),
               m_request, [this, expected](const CallResult& answer) {
                   const OnAnswer handler = std::move(m_onAnswer);
                   g_clear_object(&m_request);
                   if (answer.failed || answer.results.is(expected.c_str()))
                       return handler(answer);
                   handler({{}, {"org.freedesktop.DBus.Error.InvalidArgs", "Wrong reply"}, true});
               });
}

void ClientAgent::show(const char* member, const Value& arguments) {
    m_bus.send(m_owner, m_path, Interfaces::agent, member, arguments);
}

void ClientAgent::cancel() {
    forgetRequest();
    m_bus.send(m_owner, m_path, Interfaces::agent, "Cancel");
}

void ClientAgent::release() {
    if (busy())
        m_bus.send(m_owner, m_path, Interfaces::agent, "Cancel");
    m_bus.send(m_owner, m_path, Interfaces::agent, "Release");
}

void ClientAgent::failRequest() {
    if (!busy())
        return;
    const OnAnswer handler = std::move(m_onAnswer);
    forgetRequest();
    handler({{}, Errors::failed("Canceled"), true});
}

void ClientAgent::forgetRequest() {
    if (m_request)
        g_cancellable_cancel(m_request);
    g_clear_object(&m_request);
    m_onAnswer = nullptr;
}

} // namespace Bluetooth::Sim
