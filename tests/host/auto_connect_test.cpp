// SPDX-License-Identifier: LGPL-2.1-or-later
// Which devices are to be connected: the lists in the files, and what the daemon knows of them.

#include "fault/soak.h"
#include "support/auto_connect_fixture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/manager.h>

#include <algorithm>
#include <atomic>
#include <memory>
#include <thread>

namespace Bluetooth::Test {

namespace {

using namespace std::string_literals;

const std::string unknownLine = "adapter.cpp Does Not Exist";
const Texts both{"hci0/01", "hci0/08"};

std::string removedLine(const std::string& entry) {
    return inAutoConnect("Removed '" + entry + "' from the list of " + adapter0 +
                         ", which does not know it.");
}

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
    EXPECT_EQ(log.take(),
              (Texts{unknownLine, unknownLine, unknownLine, unknownLine, removedLine(stranger),
                     removedLine(""), removedLine(otherDevice)}));
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
    EXPECT_EQ(listOf("00:1A:7D:DA:71:99"), Texts{"no list"});
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
    EXPECT_EQ(log.take(), (Texts{unknownLine, removedLine(stranger)}));

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
    const std::string utf8 = "\xff\\";
    const std::string junk = std::string(100000, 'A');
    // The headset's address with something behind a NUL is another text than the headset's.
    setConfig(adapter0, "1,"s + headset + "\0x"s + "," + utf8 + "," + junk + ",\n," + headset);
    EXPECT_EQ(listOf(adapter0), Texts{"hci0/01"});
    EXPECT_EQ(config(adapter0), "1,"s + headset);
    EXPECT_EQ(log.take(),
              (Texts{inAutoConnect("An entry of the config file holds a NUL byte."),
                     "adapter.cpp Failed to append args to message", unknownLine, unknownLine,
                     removedLine(headset + "\\x00x"s), removedLine("\\xff\\x5c"),
                     removedLine(junk.substr(0, 64) + "..."), removedLine("\\x0a")}));
}

TEST_F(AutoConnectTest, OnlyWhatTheDaemonDeniesIsPruned) {
    const std::string content = "1,"s + headset + "," + carKit;
    for (const auto& [name, isPruned] :
         {std::pair("org.freedesktop.DBus.Error.NoReply", false),
          std::pair("org.freedesktop.DBus.Error.UnknownMethod", false),
          std::pair("org.bluez.Error.Failed", false),
          std::pair("org.bluez.Error.InvalidArguments", true),
          std::pair("org.bluez.Error.DoesNotExist", true)}) {
        setConfig(adapter0, content);
        // Texts are for people.
        const char* text = isPruned ? "Gibt es nicht" : "Does Not Exist";
        simulation.failNext("org.bluez.Adapter", "FindDevice", name, text);
        EXPECT_EQ(listOf(adapter0), Texts{"hci0/08"}) << name;
        EXPECT_EQ(config(adapter0), isPruned ? "1,"s + carKit : content) << name;
        EXPECT_EQ(pipe.take(), isPruned ? "1" : "") << name;
        Texts lines{"adapter.cpp "s + text};
        if (isPruned)
            lines.push_back(removedLine(headset));
        EXPECT_EQ(log.take(), lines);
    }
}

TEST_F(AutoConnectTest, ADaemonThatRestartsMeanwhileCostsNoEntry) {
    const std::string content = "1,"s + headset + "," + carKit;
    setConfig(adapter0, content);
    simulation.delayNext("org.bluez.Adapter", "FindDevice", 300);
    std::thread restart([this] {
        EXPECT_TRUE(simulation.awaitCalls("s:FindDevice ")); // it waits in the daemon now
        EXPECT_TRUE(autoConnect.set(adapter1, true, "")) << "a change need not wait for that";
        simulation.control("Restart");
    });
    EXPECT_EQ(listOf(adapter0), Texts());
    restart.join();
    EXPECT_EQ(config(adapter0), content);
    EXPECT_EQ(pipe.take(), "1") << "of the other list";
    EXPECT_EQ(listOf(adapter0), both);
}

TEST_F(AutoConnectTest, NoChangeIsLostBesideAProgramThatPrunes) {
    const auto add = [this](const char* device) {
        EXPECT_TRUE(autoConnect.changeList(
            adapter0, [=](AutoConnect::List& list) { list.devices.emplace_back(device); }));
    };
    const auto isListed = [this](const char* device) {
        AutoConnect::List list;
        EXPECT_TRUE(autoConnect.readList(adapter0, list));
        EXPECT_TRUE(list.isEnabled);
        return std::find(list.devices.begin(), list.devices.end(), device) != list.devices.end();
    };
    setConfig(adapter0, "1,"s + headset);
    std::atomic<bool> isOver{false};
    std::thread pruning([&] {
        while (!isOver)
            delete autoConnect.getAutoConnectDeviceList();
    });
    for (int rounds = soakCount(1000, 50); rounds > 0 && !HasFailure(); --rounds) {
        add(stranger);
        const auto isPruned = [&] {
            add(carKit);
            EXPECT_TRUE(isListed(headset) && isListed(carKit));
            EXPECT_TRUE(autoConnect.removeDevice(adapter0, carKit));
            EXPECT_TRUE(isListed(headset) && !isListed(carKit));
            return HasFailure() || !isListed(stranger);
        };
        EXPECT_TRUE(becomesTrue(isPruned));
    }
    isOver = true;
    pruning.join();
    EXPECT_EQ(config(adapter0), "1,"s + headset);
}

} // namespace Bluetooth::Test
