#include "host/sim_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/auto_connect.h>
#include <bluetooth/device.h>
#include <bluetooth/manager.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <memory>

namespace Bluetooth::Test {

namespace {

using Lines = std::vector<std::string>;
using DeviceListPtr = std::unique_ptr<DeviceList>;

std::string line(const std::string& message) {
    return "auto_connect.cpp " + message;
}

const std::string unknownLine = "adapter.cpp Does Not Exist";

/// The last components of the devices' paths after their adapter's, e.g. "hci0/01".
Lines namesOf(const DeviceListPtr& list) {
    Lines names;
    if (!list)
        return {"no list"};
    for (const Device* device : *list) {
        const std::string path = device->getPath();
        const std::size_t adapter = path.find("hci");
        names.push_back(path.substr(adapter, 5) + path.substr(path.size() - 2));
    }
    return names;
}

} // namespace

class AutoConnectTest : public SimTest {
protected:
    void SetUp() override {
        SimTest::SetUp();
        mkfifo(commandPipe, 0600);
        m_pipe = open(commandPipe, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        // Adapters ask it for their version; it is missing here, and not what is tested.
        writeFile("/usr/bin/hciconfig", "#!/bin/sh\n");
        std::filesystem::permissions("/usr/bin/hciconfig", std::filesystem::perms::all);
    }
    void TearDown() override { close(m_pipe); }

    std::string commands() const {
        char bytes[100];
        const ssize_t length = read(m_pipe, bytes, sizeof bytes);
        return std::string(bytes, length < 0 ? 0 : static_cast<std::size_t>(length));
    }
    void power(const char* adapter, bool on) {
        const std::unique_ptr<Manager> manager(Manager::getManager());
        const std::unique_ptr<Adapter> proxy(manager->findAdapter(adapter));
        EXPECT_EQ(proxy->setProperty("Powered", on), 0);
        delete proxy->getProperties(); // answered after that
    }

    DeviceListPtr listOf(const char* adapter) {
        return DeviceListPtr(autoConnect.getDeviceList(adapter));
    }
    DeviceListPtr targets() { return DeviceListPtr(autoConnect.getAutoConnectDeviceList()); }

    AutoConnect autoConnect;

private:
    int m_pipe = -1;
};

TEST_F(AutoConnectTest, ListsKnownDevicesAndPrunesStaleEntries) {
    setConfig(adapter0, std::string("1,") + carKit + "," + stranger + "," + headset + ",," +
                            speaker + "," + stranger);
    EXPECT_EQ(namesOf(listOf(adapter0)), (Lines{"hci0/02", "hci0/01"})) << "in the file's order";
    EXPECT_EQ(config(adapter0), std::string("1,") + carKit + "," + headset);
    EXPECT_EQ(commands(), "1111") << "one for each stale entry";
    EXPECT_EQ(log.take(), Lines(4, unknownLine));

    EXPECT_EQ(namesOf(listOf(adapter0)), (Lines{"hci0/02", "hci0/01"}));
    EXPECT_EQ(commands(), "");
    EXPECT_EQ(log.take(), Lines());
}

TEST_F(AutoConnectTest, ADisabledListIsReadAndNotPruned) {
    const std::string content = std::string("0,") + headset + "," + stranger;
    setConfig(adapter0, content);
    EXPECT_EQ(namesOf(listOf(adapter0)), Lines{"hci0/01"});
    EXPECT_EQ(config(adapter0), content);
    EXPECT_EQ(commands(), "");

    EXPECT_EQ(namesOf(listOf(adapter1)), Lines()) << "a new file";
    EXPECT_EQ(config(adapter1), "0");
}

TEST_F(AutoConnectTest, FailuresOfGetDeviceListAreLogged) {
    EXPECT_EQ(listOf("00:00:00:00:00:00"), nullptr);
    EXPECT_EQ(log.take(), (Lines{"manager.cpp No such adapter", line("Failed to get adapter.")}));

    const std::string file = std::string(configFolder) + adapter0;
    std::filesystem::create_directories(file);
    EXPECT_EQ(listOf(adapter0), nullptr);
    EXPECT_EQ(log.take(), Lines{line("Config '" + file + "' is not regular file.")});

    std::filesystem::remove(file);
    setConfig(adapter0, "1");
    std::filesystem::resize_file(file, 2 << 20);
    EXPECT_EQ(namesOf(listOf(adapter0)), Lines()) << "as a file that holds no entries";
    EXPECT_EQ(namesOf(targets()), Lines());
    EXPECT_EQ(log.take(), Lines(2, line("Config '" + file + "' is too large.")));

    control("DropName");
    EXPECT_EQ(listOf(adapter0), nullptr);
    EXPECT_EQ(targets(), nullptr);
    EXPECT_EQ(log.take(), Lines(2, line("Failed to get manager.")));
}

TEST_F(AutoConnectTest, TargetsAreThoseOfPoweredAndEnabledAdapters) {
    setConfig(adapter0, std::string("1,") + headset + "," + stranger);
    setConfig(adapter1, std::string("1,") + speaker);
    EXPECT_EQ(namesOf(targets()), (Lines{"hci0/01", "hci1/04"}));
    EXPECT_EQ(config(adapter0), std::string("1,") + headset);
    EXPECT_EQ(commands(), "1");
    EXPECT_EQ(log.take(), Lines{unknownLine});

    for (const char* noFlag : {"0,", "2,", "x,", ""}) {
        setConfig(adapter0, std::string(noFlag) + headset);
        EXPECT_EQ(namesOf(targets()), Lines{"hci1/04"}) << noFlag;
    }
    setConfig(adapter0, std::string("111:22,") + headset);
    EXPECT_TRUE(autoConnect.getEnable(adapter0)) << "a number is not 0 ...";
    EXPECT_EQ(namesOf(targets()), Lines{"hci1/04"}) << "... and yet not a flag";

    setConfig(adapter0, std::string("1,") + headset);
    power(adapter1, false);
    EXPECT_EQ(namesOf(targets()), Lines{"hci0/01"});
    power(adapter0, false);
    EXPECT_EQ(namesOf(targets()), Lines()) << "an empty list, not null";
    EXPECT_EQ(commands(), "");
    EXPECT_EQ(log.take(), Lines());
}

TEST_F(AutoConnectTest, EntriesThatAreNoAddressArePruned) {
    using namespace std::string_literals;
    const std::string utf8 = "\xff\xfe";
    const std::string junk = std::string(100000, 'A');
    // The headset's address with something behind a NUL is another text than the headset's.
    setConfig(adapter0, "1,"s + headset + "\0x"s + "," + utf8 + "," + junk + ",\n," + headset);
    EXPECT_EQ(namesOf(listOf(adapter0)), Lines{"hci0/01"});
    EXPECT_EQ(config(adapter0), "1,"s + headset);
    EXPECT_EQ(log.take(),
              (Lines{line("An entry of the config file holds a NUL byte."),
                     "adapter.cpp Failed to append args to message", unknownLine, unknownLine}));
}

TEST_F(AutoConnectTest, OnlyWhatTheDaemonDeniesIsPruned) {
    const std::string content = std::string("1,") + headset + "," + carKit;
    const struct {
        const char* name;
        const char* text;
        bool isPruned;
    } cases[] = {
        {"org.freedesktop.DBus.Error.NoReply", "Did not receive a reply.", false},
        {"org.freedesktop.DBus.Error.ServiceUnknown",
         "The name org.bluez was not provided by any .service files", false},
        {"org.freedesktop.DBus.Error.UnknownObject",
         "Method \"FindDevice\" with signature \"s\" on interface \"org.bluez.Adapter\" doesn't "
         "exist\n",
         false},
        {"org.freedesktop.DBus.Error.Disconnected", "Connection is closed", false},
        {"org.bluez.Error.InvalidArguments", "Invalid arguments in method call", true},
        {"org.bluez.Error.DoesNotExist", "Does Not Exist", true},
    };
    for (const auto& testCase : cases) {
        setConfig(adapter0, content);
        control("FailNext", [&](Writer& w) {
            w("org.bluez.Adapter")("FindDevice")(testCase.name)(testCase.text);
        });
        EXPECT_EQ(namesOf(listOf(adapter0)), Lines{"hci0/02"}) << testCase.text;
        EXPECT_EQ(config(adapter0), testCase.isPruned ? std::string("1,") + carKit : content)
            << testCase.text;
        EXPECT_EQ(commands(), testCase.isPruned ? "1" : "") << testCase.text;
        EXPECT_EQ(log.take().size(), 1u) << testCase.text;
    }
}

TEST_F(AutoConnectTest, ADaemonThatRestartsMeanwhileCostsNoEntry) {
    const std::string content = std::string("1,") + headset + "," + carKit;
    setConfig(adapter0, content);
    control("DelayNext",
            [](Writer& w) { w("org.bluez.Adapter")("FindDevice")(std::uint32_t{300}); });
    other.addMatch("type='signal',member='CallReceived'");
    std::thread restart([this] {
        // The call waits in the daemon when this signal is out.
        other.signals().waitUntil([](const auto& signals) {
            for (const std::string& signal : signals) {
                if (signal.find("s:FindDevice") != std::string::npos)
                    return true;
            }
            return false;
        });
        control("Restart");
    });
    const DeviceListPtr list = listOf(adapter0);
    restart.join();
    EXPECT_EQ(namesOf(list), Lines());
    EXPECT_EQ(config(adapter0), content);
    EXPECT_EQ(commands(), "");
    EXPECT_EQ(namesOf(listOf(adapter0)), (Lines{"hci0/01", "hci0/02"}));
}

} // namespace Bluetooth::Test
