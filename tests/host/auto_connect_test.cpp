// SPDX-License-Identifier: LGPL-2.1-or-later
// Which devices are to be connected: the lists in the files, and what the daemon knows of them.

#include "support/auto_connect_fixture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/manager.h>

#include <memory>
#include <thread>

namespace Bluetooth::Test {

namespace {

using namespace std::string_literals;

const std::string unknownLine = "adapter.cpp Does Not Exist";
const Texts both{"hci0/01", "hci0/08"};

/// The devices' adapters with the last part of their addresses, e.g. "hci0/01".
Texts namesOf(DeviceList* list) {
    const std::unique_ptr<DeviceList> devices(list);
    Texts names;
    if (!devices)
        return {"no list"};
    for (const Device* device : *devices) {
        const std::string path = device->getPath();
        names.push_back(path.substr(path.find("hci"), 5) + path.substr(path.size() - 2));
    }
    return names;
}

} // namespace

class AutoConnectTest : public AutoConnectFixture {
protected:
    static void power(const char* adapter, bool on) {
        const std::unique_ptr<Adapter> proxy(Manager().findAdapter(adapter));
        EXPECT_EQ(proxy->setProperty("Powered", on), 0);
        delete proxy->getProperties(); // answered after that
    }
    Texts listOf(const char* adapter) { return namesOf(autoConnect.getDeviceList(adapter)); }
    Texts targets() { return namesOf(autoConnect.getAutoConnectDeviceList()); }

    PipeReader pipe{commandPipe}; ///< the end of the daemon that is told of changes
};

TEST_F(AutoConnectTest, ListsKnownDevicesAndPrunesStaleEntriesOfAnEnabledList) {
    setConfig(adapter0, "1,"s + headset + "," + stranger + "," + carKit + ",," + otherDevice + "," +
                            stranger);
    EXPECT_EQ(listOf(adapter0), both) << "in the file's order";
    EXPECT_EQ(config(adapter0), "1,"s + headset + "," + carKit);
    EXPECT_EQ(pipe.take(), "1111") << "one for each stale entry";
    EXPECT_EQ(log.take(), Texts(4, unknownLine));
    EXPECT_EQ(listOf(adapter0), both);

    const std::string disabled = "0,"s + headset + "," + stranger;
    setConfig(adapter0, disabled);
    EXPECT_EQ(listOf(adapter0), Texts{"hci0/01"});
    EXPECT_EQ(config(adapter0), disabled);
    EXPECT_EQ(log.take(), Texts{unknownLine});
    EXPECT_EQ(listOf(adapter1), Texts()) << "a new file";
    EXPECT_EQ(config(adapter1), "0");
    EXPECT_EQ(pipe.take(), "");
}

TEST_F(AutoConnectTest, FailuresOfGetDeviceListAreLogged) {
    EXPECT_EQ(listOf("00:00:00:00:00:00"), Texts{"no list"});
    EXPECT_EQ(log.take(),
              (Texts{"manager.cpp No such adapter", inAutoConnect("Failed to get adapter.")}));

    const std::string file = std::string(configFolder) + adapter0;
    std::filesystem::create_directories(file);
    EXPECT_EQ(listOf(adapter0), Texts{"no list"});
    EXPECT_EQ(log.take(), Texts{inAutoConnect("Config '" + file + "' is not regular file.")});

    std::filesystem::remove(file);
    setConfig(adapter0, "1");
    std::filesystem::resize_file(file, 2 << 20);
    EXPECT_EQ(listOf(adapter0), Texts()) << "as a file that holds no entries";
    EXPECT_EQ(targets(), Texts());
    EXPECT_EQ(log.take(), Texts(2, inAutoConnect("Config '" + file + "' is too large.")));

    simulation.failNext("org.bluez.Manager", "ListAdapters", "org.bluez.Error.Failed", "Broken");
    EXPECT_EQ(targets(), Texts{"no list"});
    EXPECT_EQ(log.take(), Texts{inAutoConnect("Failed to get adapter list")});

    simulation.control("DropName");
    EXPECT_EQ(listOf(adapter0), Texts{"no list"});
    EXPECT_EQ(targets(), Texts{"no list"});
    EXPECT_EQ(log.take(), Texts(2, inAutoConnect("Failed to get manager.")));
}

TEST_F(AutoConnectTest, TargetsAreThoseOfPoweredAndEnabledAdapters) {
    setConfig(adapter0, "1,"s + headset + "," + stranger);
    setConfig(adapter1, "1,"s + otherDevice);
    EXPECT_EQ(targets(), (Texts{"hci0/01", "hci1/66"}));
    EXPECT_EQ(config(adapter0), "1,"s + headset);
    EXPECT_EQ(pipe.take(), "1");
    EXPECT_EQ(log.take(), Texts{unknownLine});

    for (const char* noFlag : {"0,", "2,", "x,", ""}) {
        setConfig(adapter0, std::string(noFlag) + headset);
        EXPECT_EQ(targets(), Texts{"hci1/66"}) << noFlag;
    }
    setConfig(adapter0, "111:22,"s + headset);
    EXPECT_TRUE(autoConnect.getEnable(adapter0)) << "a number is not 0 ...";
    EXPECT_EQ(targets(), Texts{"hci1/66"}) << "... and yet not a flag";

    setConfig(adapter0, "1,"s + headset);
    power(adapter1, false);
    EXPECT_EQ(targets(), Texts{"hci0/01"});
    power(adapter0, false);
    EXPECT_EQ(targets(), Texts()) << "an empty list, not null";
    EXPECT_EQ(pipe.take(), "");
    EXPECT_EQ(log.take(), Texts());
}

TEST_F(AutoConnectTest, EntriesThatAreNoAddressArePruned) {
    const std::string utf8 = "\xff\xfe";
    const std::string junk = std::string(100000, 'A');
    // The headset's address with something behind a NUL is another text than the headset's.
    setConfig(adapter0, "1,"s + headset + "\0x"s + "," + utf8 + "," + junk + ",\n," + headset);
    EXPECT_EQ(listOf(adapter0), Texts{"hci0/01"});
    EXPECT_EQ(config(adapter0), "1,"s + headset);
    EXPECT_EQ(log.take(),
              (Texts{inAutoConnect("An entry of the config file holds a NUL byte."),
                     "adapter.cpp Failed to append args to message", unknownLine, unknownLine}));
}

TEST_F(AutoConnectTest, OnlyWhatTheDaemonDeniesIsPruned) {
    const std::string content = "1,"s + headset + "," + carKit;
    for (const auto& [text, isPruned] :
         {std::pair("Did not receive a reply.", false), std::pair("Connection is closed", false),
          std::pair("The name org.bluez was not provided by any .service files", false),
          std::pair("Method \"FindDevice\" doesn't exist\n", false),
          std::pair("Invalid arguments in method call", true), std::pair("Does Not Exist", true)}) {
        setConfig(adapter0, content);
        simulation.failNext("org.bluez.Adapter", "FindDevice", "org.bluez.Error.Any", text);
        EXPECT_EQ(listOf(adapter0), Texts{"hci0/08"}) << text;
        EXPECT_EQ(config(adapter0), isPruned ? "1,"s + carKit : content) << text;
        EXPECT_EQ(pipe.take(), isPruned ? "1" : "") << text;
        EXPECT_EQ(log.take(), Texts{"adapter.cpp "s + text});
    }
}

TEST_F(AutoConnectTest, ADaemonThatRestartsMeanwhileCostsNoEntry) {
    const std::string content = "1,"s + headset + "," + carKit;
    setConfig(adapter0, content);
    simulation.delayNext("org.bluez.Adapter", "FindDevice", 300);
    std::thread restart([this] {
        EXPECT_TRUE(simulation.awaitCalls("s:FindDevice ")); // it waits in the daemon now
        simulation.control("Restart");
    });
    EXPECT_EQ(listOf(adapter0), Texts());
    restart.join();
    EXPECT_EQ(config(adapter0), content);
    EXPECT_EQ(pipe.take(), "");
    EXPECT_EQ(listOf(adapter0), both);
}

} // namespace Bluetooth::Test
