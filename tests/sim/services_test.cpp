// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

#include "core/descriptor.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <csignal>

namespace Bluetooth::Test {

namespace {

const std::string alreadyConnected = "error AlreadyConnected: Already Connected";
const std::string notAuthorized = "error NotAuthorized: Operation Not Authorized";
const std::string notConnected = "error NotConnected: Not Connected";
const Texts connected{"device Connected=b:1"};
const Texts disconnected{"device Connected=b:0"};

/// What comes back for what is written to a serial line; "" once it has ended.
/// @param before  how much comes before the echo
std::string echoOf(const Descriptor& line, const std::string& text, std::size_t before = 0) {
    const std::size_t expected = before + text.size();
    if (write(line.number(), text.data(), text.size()) < 0)
        return "";
    std::string got;
    pollfd readable{line.number(), POLLIN, 0};
    while (got.size() < expected && poll(&readable, 1, 10000) > 0) {
        char part[64];
        const ssize_t count = read(line.number(), part, sizeof part);
        if (count <= 0)
            break;
        got.append(part, static_cast<std::size_t>(count));
    }
    return got;
}

} // namespace

class ServicesTest : public SimTest {
protected:
    ServicesTest() { std::signal(SIGPIPE, SIG_IGN); }

    /// Opens the terminal that Serial.Connect names.
    Descriptor openPort(const char* pattern) {
        port = call({"Serial.Connect", pattern}).substr(2);
        return Descriptor(open(port.c_str(), O_RDWR | O_NOCTTY));
    }
    std::string askOther(const Question& question) { return other->call(question); }

    std::string port;
    std::unique_ptr<SimClient> other = std::make_unique<SimClient>();
};

TEST_F(ServicesTest, AKeyboardConnectsFromBothSides) {
    create({{"UUIDs", "1124"}, {"Refuses", "1124"}});
    EXPECT_EQ(call("Input.Connect"), "error Failed: Connection refused (111)");
    control({"SetDevice", newDevice, Settings{{"Refuses", ""}}});
    EXPECT_EQ(trace("Input.Connect"), connected + lines("answer Connect"));
    EXPECT_EQ(call("Input.Connect"), alreadyConnected);
    EXPECT_EQ(effectOf("Input.Disconnect"), lines("answer Disconnect") + disconnected);

    const Question comeIn("ConnectService", "hci0", newDevice, "1124");
    registerAgent();
    peer().replyError("Authorize", "org.bluez.Error.Rejected", "said no");
    control(comeIn);
    until("agent Authorize o:device s:00001124-0000-1000-8000-00805f9b34fb");
    EXPECT_EQ(call("Input.GetProperties"), "a(e(s:Connected v(b:0)))");
    peer().reply("Authorize");
    control(comeIn);
    until(connected[0]);
    control({"DisconnectService", "hci0", newDevice, "1124"});
    EXPECT_EQ(taken(), disconnected);

    call("Input.Connect");
    EXPECT_EQ(trace("Device.Disconnect", "answer"),
              lines("device DisconnectRequested") + disconnected + lines("answer Disconnect"));
    EXPECT_EQ(until(disconnected[0]), disconnected); // the device's own
    control({"SetDevice", newDevice, Settings{{"Connectable", "false"}}});
    EXPECT_EQ(call("Input.Connect"), "error Failed: Host is down (112)");
    set("Powered", false);
    EXPECT_EQ(call("Input.Connect"), "error Failed: connect: No route to host (113)");
}

TEST_F(ServicesTest, RecordsAddToTheAdapterUntilTheirClientLeaves) {
    const auto record = [](const char* uuid) {
        return std::string("<record><attribute id='1'><sequence><uuid value='") + uuid +
               "'/></sequence></attribute></record>";
    };
    const auto uuids = [](const std::string& adapter, const std::string& added) {
        const std::string rest = "-0000-1000-8000-00805f9b34fb";
        const std::string again = adapter == "hci0" ? " s:0000" : ""; // it came before hci1
        std::string line = adapter + " UUIDs=a(";
        for (const std::string uuid : {"1000", "1001"})
            line += "s:0000" + uuid + rest + (again.empty() ? again : again + uuid + rest) + " ";
        for (const char* uuid : {"1112", "111f", "110c", "110e"})
            line += std::string("s:0000") + uuid + rest + " ";
        line += added.empty() ? "" : "s:" + added + " ";
        line.back() = ')';
        return line;
    };
    const std::string push = "00001105-0000-1000-8000-00805f9b34fb";
    const std::string own = "12345678-1234-1234-1234-123456789abc";
    const std::string plain = "hci0 Class=u:7209216";
    const std::string withObjects = "hci0 Class=u:8257792";
    EXPECT_EQ(effectOf({"Service.AddRecord", record("0x1105")}),
              lines(uuids("hci0", push), "answer AddRecord u:65544", withObjects));
    EXPECT_EQ(effectOf({"Service.UpdateRecord", 65544U, record(own.c_str())}),
              lines(uuids("hci0", ""), uuids("hci0", own), "answer UpdateRecord", plain));
    EXPECT_EQ(askOther({"Service.RemoveRecord", 65544U}),
              "error NotAvailable: Operation currently not available");
    EXPECT_EQ(effectOf({"Service.RemoveRecord", 65544U}),
              lines(uuids("hci0", ""), "answer RemoveRecord"));

    EXPECT_EQ(other->call({"Service.AddRecord", record("1105")}, base + "any"), "u:65544");
    EXPECT_EQ(askOther({"NetworkServer.Register", "nap", "bridge"}), "");
    effectOf("Adapter.ListDevices"); // their signals are here now
    leave(other);
    EXPECT_EQ(taken(), lines(uuids("hci0", push), uuids("hci0", ""), uuids("hci1", ""), plain,
                             "hci1 Class=u:7209216"));
}

TEST_F(ServicesTest, AuthorizationsAreTheAgentsUnlessTheDeviceIsTrusted) {
    create();
    registerAgent();
    call({"Service.AddRecord",
          "<record><attribute id='1'><sequence><uuid value='1101'/></sequence></attribute>"});
    const Question request("Service.RequestAuthorization", newDevice, 65544U);
    const Texts asked{"agent Authorize o:device s:00001101-0000-1000-8000-00805f9b34fb"};
    const std::string answer = "answer RequestAuthorization";
    EXPECT_EQ(trace(request), asked + lines(answer));
    peer().replyError("Authorize", "org.bluez.Error.Rejected", "said no");
    EXPECT_EQ(trace(request), asked + lines(answer + " " + notAuthorized));

    peer().neverReply("Authorize");
    start(request);
    until(asked[0]);
    EXPECT_EQ(call(request), "error DoesNotExist: Does Not Exist");
    EXPECT_EQ(trace("Service.CancelAuthorization"),
              lines("agent Cancel", answer + " " + notAuthorized, "answer CancelAuthorization"));
    setOfDevice("Trusted", true);
    EXPECT_EQ(trace(request), lines(answer));
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(call(request), notAuthorized);
}

TEST_F(ServicesTest, ASerialProxyConnectsDevicesToASocket) {
    create({{"Name", "Phone"}, {"Trusted", "true"}});
    setOfDevice("Trusted", true);
    const Descriptor server(socket(AF_UNIX, SOCK_STREAM, 0));
    sockaddr_un at{};
    at.sun_family = AF_UNIX;
    const std::string name = "kes-" + std::to_string(getpid());
    name.copy(at.sun_path + 1, name.size()); // abstract
    ASSERT_EQ(bind(server.number(), reinterpret_cast<sockaddr*>(&at), sizeof at), 0);
    ASSERT_EQ(listen(server.number(), 1), 0);

    EXPECT_EQ(trace({"SerialProxyManager.CreateProxy", "spp", "x00" + name}),
              lines("hci0 ProxyCreated s:hci0/proxy0", "answer CreateProxy s:hci0/proxy0"));
    const std::string proxy = base + "hci0/proxy0";
    EXPECT_EQ(call("SerialProxy.Enable", proxy), "");
    control({"ConnectService", "hci0", newDevice, "1101"});
    const Descriptor line(accept(server.number(), nullptr, nullptr));
    EXPECT_EQ(echoOf(line, "hello", 7), "Phone\r\nhello");
    EXPECT_NE(call("SerialProxy.GetInfo", proxy).find("(s:connected v(b:1))"), std::string::npos);
    EXPECT_EQ(
        call({"SerialProxy.SetSerialParameters", "9600", std::uint8_t{8}, std::uint8_t{1}, "none"},
             proxy),
        notAuthorized);
    EXPECT_EQ(askOther({"SerialProxyManager.RemoveProxy", proxy}), notAuthorized);
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(echoOf(line, "hello"), "");
    EXPECT_NE(call("SerialProxy.GetInfo", proxy).find("(s:connected v(b:0))"), std::string::npos);

    EXPECT_EQ(askOther({"SerialProxyManager.CreateProxy", "dun", "x00other"}), "s:hci0/proxy1");
    until("hci0 ProxyCreated s:hci0/proxy1");
    leave(other);
    EXPECT_EQ(taken(), lines("hci0 ProxyRemoved s:hci0/proxy1"));
}

TEST_F(ServicesTest, ASerialPortIsATerminalUntilItsClientOrItsDeviceClosesIt) {
    create({{"UUIDs", "1101;1103"}});
    const Descriptor line = openPort("spp");
    ASSERT_TRUE(line.isOpen()) << port;
    EXPECT_EQ(echoOf(line, "AT\r\n\x03"), "AT\r\n\x03"); // byte for byte
    EXPECT_EQ(call({"Serial.Connect", "1"}), "error Failed: Port already in use");
    EXPECT_EQ(askOther({"Serial.Disconnect", "spp"}), notAuthorized);
    EXPECT_EQ(call({"Serial.Disconnect", port.c_str()}), "");
    EXPECT_EQ(echoOf(line, "AT"), "");
    EXPECT_EQ(call({"Serial.Disconnect", "1101"}), notConnected);

    const Descriptor second = openPort("1103");
    control({"DisconnectService", "hci0", newDevice, "1103"});
    EXPECT_EQ(echoOf(second, "AT"), "");
    EXPECT_EQ(call({"Serial.Connect", "2"}), "error Failed: Port already in use");
    EXPECT_EQ(call({"Serial.Disconnect", "dun"}), "");

    EXPECT_EQ(askOther({"Serial.Connect", "spp"}).rfind("s:/dev/", 0), 0U);
    leave(other);
    const Descriptor third = openPort("spp");
    control({"DropLink", "hci0", newDevice});
    EXPECT_EQ(echoOf(third, "AT"), "");
}

TEST_F(ServicesTest, ConnectFDGivesADescriptorThatIsTheClients) {
    create({{"UUIDs", "1101"}});
    for (int time = 0; time < 2; ++time) { // the port is not kept
        const MessagePtr reply =
            peer()
                .call("org.bluez", device.text, "org.bluez.Serial", "ConnectFD", with("spp"))
                .get();
        int number = -1;
        ASSERT_TRUE(dbus_message_get_args(reply.get(), nullptr, DBUS_TYPE_UNIX_FD, &number,
                                          DBUS_TYPE_INVALID));
        const Descriptor line(number);
        EXPECT_EQ(echoOf(line, "hello"), "hello");
        if (time == 1)
            control({"DropLink", "hci0", newDevice});
        EXPECT_EQ(echoOf(line, "hello"), time == 1 ? "" : "hello");
    }
}

TEST_F(ServicesTest, ANetworkIsConnectedOnlyByADaemonThatDoesAsItsDocumentSays) {
    const std::string nap = "00001116-0000-1000-8000-00805f9b34fb";
    create({{"UUIDs", "1115;1116"}, {"DocumentedNetwork", "true"}});
    EXPECT_EQ(call({"Network.Connect", "gn"}), "error NotSupported: Operation is not supported");
    EXPECT_EQ(trace({"Network.Connect", "NAP"}, "device UUID"),
              lines("answer Connect s:bnep0") + connected +
                  lines("device Interface=s:bnep0", "device UUID=s:" + nap));
    EXPECT_EQ(call({"Network.Connect", "panu"}), alreadyConnected);
    EXPECT_EQ(call("Network.GetProperties"),
              "a(e(s:Connected v(b:1)) e(s:Interface v(s:bnep0)) e(s:UUID v(s:" + nap + ")))");
    EXPECT_EQ(askOther("Network.Disconnect"), notAuthorized);
    const Texts lost = disconnected + lines("device Interface=s:", "device UUID=s:");
    EXPECT_EQ(effectOf("Network.Disconnect"), lines("answer Disconnect") + lost);
    EXPECT_EQ(call("Network.Disconnect"), notConnected);
    EXPECT_EQ(askOther({"Network.Connect", nap.c_str()}), "s:bnep0");
    until("device UUID");
    leave(other);
    EXPECT_EQ(taken(), lost);
}

} // namespace Bluetooth::Test
