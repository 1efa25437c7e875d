#include "scanner/scanner_test.h"

#include <algorithm>
#include <thread>

namespace Bluetooth::Test {

namespace {

// Nothing is in reach until a test says so.
constexpr const char* scenario = R"([Adapter hci0]
Address=00:1A:7D:DA:71:10

[Adapter hci1]
Address=00:1A:7D:DA:71:11

[Device 00:11:22:33:44:01]
Name=Mouse
Adapter=hci0
Behaviour=AlreadyPaired
Present=false

[Device 00:11:22:33:44:02]
Name=Phone
Class=360
RSSI=-60
Behaviour=JustWorks
Present=false

[Device 00:11:22:33:44:03]
Name=Speaker
Adapter=hci1
Present=false
)";

std::string textOf(DBusMessage* reply) {
    if (!reply)
        return "NO REPLY";
    std::string arguments = argumentsOf(reply);
    if (dbus_message_get_type(reply) != DBUS_MESSAGE_TYPE_ERROR)
        return arguments;
    return "ERROR " + arguments.substr(std::string("s:").size());
}

/// Whether a signal tells of a call:
/// CallReceived o:/org/bluez/1234/hci0 s:org.bluez.Adapter s:StartDiscovery s::1.7
bool tellsOf(const std::string& signal, const char* adapter, const char* member) {
    return signal.find(std::string("/") + adapter + " ") != std::string::npos &&
           signal.find(std::string(" s:") + member + " ") != std::string::npos;
}

std::size_t countIn(const std::vector<std::string>& signals, const char* adapter,
                    const char* member) {
    return static_cast<std::size_t>(
        std::count_if(signals.begin(), signals.end(),
                      [&](const std::string& signal) { return tellsOf(signal, adapter, member); }));
}

} // namespace

ScannerTest::ScannerTest() : simulation(scenario) {
    system.addMatch("type='signal',interface='com.kestrine.bluetooth.Sim'");
}

std::size_t ScannerTest::countCalls(const char* adapter, const char* member) {
    // Answered when the daemon has handled, and told of, what was sent to it before.
    simulation.control("ClearFaults");
    return countIn(system.signals().events(), adapter, member);
}

bool ScannerTest::awaitCalls(const char* adapter, const char* member, std::size_t count) {
    return system.signals().waitUntil([&](const std::vector<std::string>& signals) {
        return countIn(signals, adapter, member) >= count;
    });
}

std::string ScannerTest::lastCaller() {
    simulation.control("ClearFaults");
    const std::string signal = system.signals().events().back();
    return signal.substr(signal.rfind("s:") + 2);
}

std::string ScannerTest::call(const char* method, const char* adapterId) {
    return textOf(session
                      .call(serviceName, "/", serviceInterface, method,
                            [adapterId](Writer& w) { w(adapterId); })
                      .get()
                      .get());
}

std::string ScannerTest::askUntil(const char* adapterId,
                                  const std::function<bool(const std::string&)>& wanted) {
    const auto end = std::chrono::steady_clock::now() + patience;
    std::string answer = ask(adapterId);
    while (!wanted(answer) && std::chrono::steady_clock::now() < end) {
        std::this_thread::sleep_for(Milliseconds(10));
        answer = ask(adapterId);
    }
    return answer;
}

std::string ScannerTest::askUntilListed(const char* adapterId, const char* address) {
    std::string answer =
        askUntil(adapterId, [address](const std::string& text) { return lists(text, address); });
    EXPECT_TRUE(lists(answer, address)) << address << " not in " << answer;
    return answer;
}

std::string ScannerTest::askUntilGone(const char* adapterId, const char* address) {
    std::string answer =
        askUntil(adapterId, [address](const std::string& text) { return !lists(text, address); });
    EXPECT_FALSE(lists(answer, address)) << address << " still in " << answer;
    return answer;
}

} // namespace Bluetooth::Test
