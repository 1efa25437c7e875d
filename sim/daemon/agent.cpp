#include "daemon/agent.h"

namespace Bluetooth::Sim {

namespace {

constexpr const char* kInterface = "org.bluez.Agent";

} // namespace

Agent::Agent(BusLink& bus, std::string owner, std::string path, Capability capability)
    : bus_(bus), owner_(std::move(owner)), path_(std::move(path)), capability_(capability) {}

Agent::~Agent() {
    forgetRequest();
}

void Agent::ask(const char* member, const Value& arguments, const char* resultSignature,
                guint timeout, OnAnswer onAnswer) {
    forgetRequest();
    request_ = g_cancellable_new();
    onAnswer_ = std::move(onAnswer);
    const std::string expected = std::string("(") + resultSignature + ")";
    bus_.call(owner_, path_, kInterface, member, arguments, static_cast<int>(timeout), request_,
              [this, expected](const Answer& answer) {
                  const OnAnswer handler = std::move(onAnswer_);
                  g_clear_object(&request_);
                  if (answer.failed || answer.results.is(expected.c_str()))
                      return handler(answer);
                  handler({{}, {"org.freedesktop.DBus.Error.InvalidArgs", "Wrong reply"}, true});
              });
}

void Agent::show(const char* member, const Value& arguments) {
    bus_.send(owner_, path_, kInterface, member, arguments);
}

void Agent::cancel() {
    forgetRequest();
    bus_.send(owner_, path_, kInterface, "Cancel");
}

void Agent::release() {
    if (busy()) {
        failRequest();
        bus_.send(owner_, path_, kInterface, "Cancel");
    }
    bus_.send(owner_, path_, kInterface, "Release");
}

void Agent::ownerGone() {
    if (busy())
        failRequest();
}

void Agent::failRequest() {
    const OnAnswer handler = std::move(onAnswer_);
    forgetRequest();
    handler({{}, Errors::failed("Canceled"), true});
}

void Agent::forgetRequest() {
    if (request_)
        g_cancellable_cancel(request_);
    g_clear_object(&request_);
    onAnswer_ = nullptr;
}

} // namespace Bluetooth::Sim
