#include "daemon/agent.h"

#include "serving/bluez4/errors.h"
#include "serving/bluez4/interfaces.h"

namespace Bluetooth::Sim {

Agent::Agent(BusConnection& bus, std::string owner, std::string path, Capability capability)
    : m_bus(bus), m_owner(std::move(owner)), m_path(std::move(path)), m_capability(capability) {}

Agent::~Agent() {
    forgetRequest();
}

void Agent::ask(const char* member, const Value& arguments, const char* resultSignature,
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

void Agent::show(const char* member, const Value& arguments) {
    m_bus.send(m_owner, m_path, Interfaces::agent, member, arguments);
}

void Agent::cancel() {
    forgetRequest();
    m_bus.send(m_owner, m_path, Interfaces::agent, "Cancel");
}

void Agent::release() {
    if (busy())
        m_bus.send(m_owner, m_path, Interfaces::agent, "Cancel");
    m_bus.send(m_owner, m_path, Interfaces::agent, "Release");
}

void Agent::failRequest() {
    if (!busy())
        return;
    const OnAnswer handler = std::move(m_onAnswer);
    forgetRequest();
    handler({{}, Errors::failed("Canceled"), true});
}

void Agent::forgetRequest() {
    if (m_request)
        g_cancellable_cancel(m_request);
    g_clear_object(&m_request);
    m_onAnswer = nullptr;
}

} // namespace Bluetooth::Sim
