#ifndef KESBLUETOOTH_TESTS_SIM_TEST_H
#define KESBLUETOOTH_TESTS_SIM_TEST_H

#include "host/namespace_test.h"
#include "support/private_bus.h"
#include "support/raw_peer.h"

#include <map>

namespace Bluetooth::Test {

inline constexpr const char* adapter0 = "00:1A:7D:DA:71:10";
inline constexpr const char* adapter1 = "00:1A:7D:DA:71:11";
inline constexpr const char* headset = "00:11:22:33:44:01";  // hci0, with a sink
inline constexpr const char* carKit = "00:11:22:33:44:02";   // hci0, without a sink
inline constexpr const char* keyboard = "00:11:22:33:44:03"; // hci0, no audio
inline constexpr const char* speaker = "00:11:22:33:44:04";  // hci1, with a sink
inline constexpr const char* stranger = "DE:AD:BE:EF:00:01"; // known to none

/// The simulated daemon in its own process, on a system bus of the test's own.
class SimTest : public NamespaceTest {
protected:
    SimTest() {
        writeFile("/tmp/scenario.conf",
                  "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\n"
                  "[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\n"
                  "[Device 00:11:22:33:44:01]\nAdapter=hci0\nKnown=true\nUUIDs=110b;110e\n"
                  "[Device 00:11:22:33:44:02]\nAdapter=hci0\nKnown=true\nUUIDs=1108;111e\n"
                  "[Device 00:11:22:33:44:03]\nAdapter=hci0\nKnown=true\nUUIDs=1124\n"
                  "[Device 00:11:22:33:44:04]\nAdapter=hci1\nKnown=true\nUUIDs=110b\n");
        m_sim = std::make_unique<ChildProcess>(
            std::vector<std::string>{BLUEZ4_SIM, "--print-ready", "--time-scale", "0.01",
                                     "--scenario", "/tmp/scenario.conf"},
            ChildProcess::Output::Capture);
        m_sim->readLine();
    }

    /// Calls the simulation's control interface and waits for its answer.
    MessagePtr control(const char* method, const RawPeer::Build& arguments = {}) {
        MessagePtr reply = startControl(method, arguments).get();
        EXPECT_TRUE(reply && dbus_message_get_type(reply.get()) != DBUS_MESSAGE_TYPE_ERROR)
            << method << " " << (reply ? argumentsOf(reply.get()) : "no reply");
        return reply;
    }
    std::future<MessagePtr> startControl(const char* method, const RawPeer::Build& arguments) {
        constexpr const char* name = "com.kestrine.bluetooth.Sim";
        return other.call(name, "/com/kestrine/bluetooth/Sim", name, method, arguments);
    }
    void setConnectable(const char* device, bool connectable) {
        control("SetDevice", [&](Writer& w) {
            w(device).dict("sv", [&](Writer& e) { e.entry("Connectable", Var{connectable}); });
        });
    }

    void setConfig(const char* adapter, const std::string& content) {
        std::filesystem::create_directory(configFolder);
        writeFile(std::string(configFolder) + adapter, content);
    }
    static std::string config(const char* adapter) {
        return readFile(std::string(configFolder) + adapter);
    }

    PrivateBus bus{PrivateBus::Kind::System};

private:
    std::unique_ptr<ChildProcess> m_sim;

protected:
    RawPeer other{bus.address()};
};

} // namespace Bluetooth::Test

#endif
