// SPDX-License-Identifier: LGPL-2.1-or-later
#include "support/simulation.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <fstream>

namespace Bluetooth::Test {

namespace {

constexpr const char* controlName = "com.kestrine.bluetooth.Sim";

Texts command(const std::string& scenario) {
    Texts words{BLUEZ4_SIM, "--print-ready", "--time-scale", "0.01"};
    if (!scenario.empty()) {
        const std::string file = testFolder() + "/scenario.conf";
        std::ofstream(file) << scenario;
        words.insert(words.end(), {"--scenario", file});
    }
    return words;
}

std::size_t countIn(const Texts& signals, const std::string& what) {
    return static_cast<std::size_t>(
        std::count_if(signals.begin(), signals.end(), [&](const std::string& signal) {
            return signal.find(what) != std::string::npos;
        }));
}

} // namespace

// Leaks would hide in GLib's slabs.
Simulation::Simulation(const std::string& scenario)
    : m_process(command(scenario), ChildProcess::Output::Capture, {"G_SLICE=always-malloc"}) {
    if (m_process.readLine() != "ready")
        throw std::runtime_error("bluez4-sim does not start: " + m_process.readErrors());
}

Simulation::~Simulation() {
    m_process.signal(SIGTERM);
    const int status = m_process.wait();
    m_process.readAll();
    const std::string errors = m_process.readErrors();
    // A test may kill it or its bus, after which our SIGTERM may find it at its very end. That it
    // ends by itself, or by a sanitizer, nobody wants.
    const bool isFound = errors.find("Sanitizer") != std::string::npos ||
                         errors.find("runtime error") != std::string::npos;
    const bool wasEnded = status == 1 || status == 128 + SIGKILL || status == 128 + SIGTERM;
    EXPECT_TRUE(status == 0 ? errors.empty() : wasEnded && !isFound)
        << "bluez4-sim ended with " << status << ": " << errors;
}

MessagePtr Simulation::control(const std::string& method, const Build& arguments) {
    constexpr const char* path = "/com/kestrine/bluetooth/Sim";
    MessagePtr reply = m_peer.call(controlName, path, controlName, method, arguments).get();
    EXPECT_TRUE(reply && dbus_message_get_type(reply.get()) != DBUS_MESSAGE_TYPE_ERROR)
        << method << ": " << (reply ? argumentsOf(reply.get()) : "no reply");
    return reply;
}

void Simulation::failNext(const char* interface, const char* method, const char* name,
                          const char* text) {
    control("FailNext", with(interface, method, name, text));
}

void Simulation::delayNext(const char* interface, const char* method, std::uint32_t milliseconds) {
    control("DelayNext", with(interface, method, milliseconds));
}

Texts Simulation::calls() {
    // Answered when the daemon has handled, and told of, what was sent to it before.
    control("ClearFaults");
    return m_peer.signals().events();
}

std::size_t Simulation::countCalls(const std::string& what) {
    return countIn(calls(), what);
}

bool Simulation::awaitCalls(const std::string& what, std::size_t count) {
    return m_peer.signals().waitUntil(
        [&](const Texts& signals) { return countIn(signals, what) >= count; });
}

} // namespace Bluetooth::Test
