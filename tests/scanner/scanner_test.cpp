#include "scanner/scanner_test.h"

#include <thread>

namespace Bluetooth::Test {

namespace {

// Nothing is in reach until a test says so.
constexpr const char* scenario =
    "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\n[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\n"
    "[Device 00:11:22:33:44:01]\nName=Mouse\nAdapter=hci0\nBehaviour=AlreadyPaired\n"
    "Present=false\n"
    "[Device 00:11:22:33:44:02]\nName=Phone\nClass=360\nRSSI=-60\nPresent=false\n"
    "[Device 00:11:22:33:44:03]\nName=Speaker\nAdapter=hci1\nPresent=false\n";

std::string textOf(DBusMessage* reply) {
    if (!reply)
        return "NO REPLY";
    std::string arguments = argumentsOf(reply);
    if (dbus_message_get_type(reply) != DBUS_MESSAGE_TYPE_ERROR)
        return arguments;
    return "ERROR " + arguments.substr(std::string("s:").size());
}

} // namespace

ScannerTest::ScannerTest() : simulation(scenario) {
    simulation.watchCalls();
}

std::string ScannerTest::pathOf(const char* adapter) {
    const MessagePtr reply = system
                                 .call("org.bluez", "/", "org.bluez.Manager", "FindAdapter",
                                       [adapter](Writer& w) { w(adapter); })
                                 .get();
    return argumentsOf(reply.get()).substr(std::string("o:").size());
}

std::string ScannerTest::call(const char* method, const char* adapterId) {
    return textOf(session
                      .call(serviceName, "/", serviceInterface, method,
                            [adapterId](Writer& w) { w(adapterId); })
                      .get()
                      .get());
}

std::string ScannerTest::askUntilListed(const char* adapterId, const char* address, bool listed) {
    const auto end = std::chrono::steady_clock::now() + patience;
    std::string answer = ask(adapterId);
    while (lists(answer, address) != listed && std::chrono::steady_clock::now() < end) {
        std::this_thread::sleep_for(Milliseconds(10));
        answer = ask(adapterId);
    }
    EXPECT_EQ(lists(answer, address), listed) << address << ": " << answer;
    return answer;
}

} // namespace Bluetooth::Test
