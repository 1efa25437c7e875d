#include "support/simulation.h"

#include <gtest/gtest.h>

#include <fstream>

namespace Bluetooth::Test {

namespace {

constexpr const char* controlName = "com.kestrine.bluetooth.Sim";
constexpr const char* controlPath = "/com/kestrine/bluetooth/Sim";

std::vector<std::string> command(const std::string& scenario) {
    std::vector<std::string> words{BLUEZ4_SIM, "--print-ready", "--time-scale", "0.01"};
    if (!scenario.empty()) {
        const std::string file = testFolder() + "/scenario.conf";
        std::ofstream(file) << scenario;
        words.insert(words.end(), {"--scenario", file});
    }
    return words;
}

} // namespace

Simulation::Simulation(const std::string& scenario)
    : m_process(command(scenario), ChildProcess::Output::Capture) {
    EXPECT_EQ(m_process.readLine(), "ready");
}

std::future<MessagePtr> Simulation::startControl(const std::string& method,
                                                 const Build& arguments) {
    return m_peer.call(controlName, controlPath, controlName, method, arguments);
}

MessagePtr Simulation::control(const std::string& method, const Build& arguments) {
    MessagePtr reply = startControl(method, arguments).get();
    EXPECT_TRUE(reply && dbus_message_get_type(reply.get()) != DBUS_MESSAGE_TYPE_ERROR)
        << method << ": " << (reply ? argumentsOf(reply.get()) : "no reply");
    return reply;
}

void Simulation::emit(const std::string& path, const std::string& interface,
                      const std::string& member, const char* signature, const Build& argument) {
    control("EmitSignal",
            [&](Writer& w) { w(Path{path})(interface)(member).variant(signature, argument); });
}

void Simulation::failNext(const char* interface, const char* method, const char* name,
                          const char* text) {
    control("FailNext", [&](Writer& w) { w(interface)(method)(name)(text); });
}

} // namespace Bluetooth::Test
