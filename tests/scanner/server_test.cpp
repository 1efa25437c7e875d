// SPDX-License-Identifier: LGPL-2.1-or-later
// The server inside the test's process, where its parts can be reached.

#include "scanner/scanner_test.h"
#include "support/running_loop.h"
#include "support/stdout_capture.h"

#include <bluetooth/scanner_server.h>

#include <thread>

namespace Bluetooth::Test {

namespace {

auto makeObject() {
    return std::unique_ptr<ScannerObject, decltype(&g_object_unref)>(
        static_cast<ScannerObject*>(g_object_new(scanner_object_get_type(), nullptr)),
        g_object_unref);
}

/// @return the error of a handler that has failed, as DOMAIN/CODE TEXT; "" when none was set
template <class Handler>
std::string errorOf(Handler handler) {
    GError* error = nullptr;
    EXPECT_FALSE(handler(&error));
    std::string text;
    if (error)
        text = std::to_string(error->domain) + "/" + std::to_string(error->code) + " " +
               error->message;
    g_clear_error(&error);
    return text;
}

/// A server whose loop runs on a thread of its own.
class RunningServer {
public:
    ~RunningServer() {
        do
            server.quitLoop(); // lost as long as the loop has not begun
        while (!m_ended.wait(Milliseconds(10)));
        m_thread.join();
    }
    bool waitForEnd() const { return m_ended.wait(); }

    ScannerServer server;

private:
    Latch m_ended;
    std::thread m_thread{[this] {
        server.startLoop();
        m_ended.open();
    }};
};

} // namespace

class ServerTest : public ScannerTest {
protected:
    void SetUp() override { KES_NEEDS_RECEIVE_LOOP(); }

    static bool ticks(ScannerServer& server, int count) {
        bool all = true;
        for (int tick = 0; tick < count; ++tick)
            all = updateTimer(&server) == 1 && all;
        return all;
    }
};

TEST_F(ServerTest, FrameTellsAboutTheBus) {
    ServerObject frame("com.example.Frame", "/frame", DBUS_BUS_SESSION);
    EXPECT_STREQ(frame.getBusName(), "org.freedesktop.DBus");
    EXPECT_STREQ(frame.getPath(), "/org/freedesktop/DBus");
    EXPECT_STREQ(frame.getInterface(), "org.freedesktop.DBus");
    EXPECT_EQ(frame.getConnectionName()[0], ':');
    StdoutCapture output;
    frame.printInfo();
    EXPECT_EQ(output.take(), "ServerObject name: org.freedesktop.DBus\n"
                             "Path: /org/freedesktop/DBus\n"
                             "Interface: org.freedesktop.DBus\n");
    frame.quitLoop();
    frame.startLoop(); // returns: it is no scanner server
    EXPECT_EQ(updateTimer(&frame), 1);
    EXPECT_TRUE(log.take().empty());
    // The bus refuses a name; what libdbus would end the process on does not get as far.
    const DBusGObjectInfo nothing{1, nullptr, 0, "", "", ""};
    for (const auto& [name, path, text] :
         {std::tuple("no name", "/", "Requested bus name \"no name\" is not valid"),
          std::tuple("com.example.X", "x", "Invalid name or path"),
          std::tuple("\xff", "/", "Invalid name or path")}) {
        ServerObject unusable(name, path, DBUS_BUS_SESSION);
        EXPECT_FALSE(unusable.prepareObjectInfo(G_TYPE_OBJECT, &nothing, nullptr));
        EXPECT_EQ(log.take(),
                  Texts{std::string("server_object.cpp Failed to acquire ") + name + ", " + text});
    }
}

TEST_F(ServerTest, OnlyReachingZeroEndsTheLoop) {
    ScannerServer server;
    EXPECT_TRUE(server.isInFilterSet(knownMouse));
    EXPECT_FALSE(server.isInFilterSet(phone));
    EXPECT_EQ(server.getInfoFromMap(phone), "");
    server.putInfoToMap(phone, "a: 1;");
    server.putInfoToMap(phone, "b: 2;");
    EXPECT_EQ(server.getInfoFromMap(phone), "b: 2;");
    EXPECT_TRUE(ticks(server, 29));
    server.addAdapterFounder("hci0");
    EXPECT_TRUE(ticks(server, 29));
    server.addAdapterFounder("hci9"); // no finder, no more time
    server.startLoop();               // the timer's tick is the thirtieth
    EXPECT_TRUE(ticks(server, 40));   // below zero it goes on
    EXPECT_EQ(starts("hci0"), 1u);
    server.stopDiscovery();
    EXPECT_EQ(stops("hci0"), 1u);
}

TEST_F(ServerTest, SecondFinderOfAnAdapterIsNotListed) {
    ScannerServer server;
    const auto object = makeObject();
    const std::string path = pathOf("hci0");
    AddressSet* first = object->addFinder(path.c_str());
    ASSERT_NE(first, nullptr);
    AddressSet* second = object->addFinder(path.c_str());
    ASSERT_NE(second, nullptr);
    EXPECT_NE(first, second);
    EXPECT_EQ(object->getListByName(path), first);
    EXPECT_EQ(object->finders.size(), 1u);
    EXPECT_EQ(starts("hci0"), 2u);
    EXPECT_EQ(object->addFinder("/org/bluez/1/hci9"), nullptr);
    EXPECT_EQ(object->getListByName("/org/bluez/1/hci9"), nullptr);

    GError* error = nullptr;
    EXPECT_TRUE(scanner_object_remove_finder(object.get(), "hci0", &error));
    EXPECT_EQ(error, nullptr);
    EXPECT_TRUE(object->finders.empty());
    EXPECT_EQ(stops("hci0"), 1u); // of two: the other runs on
}

TEST_F(ServerTest, SignalMakesAFinderWhileOneLoopRuns) {
    RunningServer running;
    EXPECT_EQ(ask("hci1"), emptyAnswer);
    running.server.startLoop(); // returns: one loop at a time
    running.server.addAdapterFounder("hci0");
    running.server.addAdapterFounder("00:1A:7D:DA:71:10"); // the same adapter once more
    comeInReach(phone);
    askUntilListed("hci0", phone);
    EXPECT_EQ(starts("hci0"), 2u);

    EXPECT_EQ(call("RemoveFinder", "hci0"), "");
    simulation.setDevice(newDevice, "Name", "New", "AddDevice");
    ASSERT_TRUE(awaitStarts("hci0", 3)); // nobody asked
    askUntilListed("hci0", newDevice);
    EXPECT_EQ(starts("hci0"), 3u);
    running.server.quitLoop();
    EXPECT_TRUE(running.waitForEnd());
}

TEST_F(ServerTest, HandlersTellWhatIsMissing) {
    GHashTable* devices = nullptr;
    const auto listDevices = [&](ScannerObject* object) {
        return errorOf([&](GError** error) {
            return scanner_object_list_devices(object, "hci0", &devices, error);
        });
    };
    const auto removeFinder = [](ScannerObject* object, const char* adapter) {
        return errorOf(
            [&](GError** error) { return scanner_object_remove_finder(object, adapter, error); });
    };
    const auto object = makeObject();
    EXPECT_EQ(listDevices(nullptr), "3/0 Object hci0 not found");
    EXPECT_EQ(listDevices(object.get()), "3/0 Server hci0 not found");
    EXPECT_EQ(object->addFinder("hci0"), nullptr);
    EXPECT_EQ(removeFinder(nullptr, "hci0"), "3/0 Scanner or AdapterId is null");
    EXPECT_EQ(removeFinder(object.get(), nullptr), "3/0 Scanner or AdapterId is null");
    EXPECT_EQ(removeFinder(object.get(), "hci0"), "");
    {
        const ScannerServer server;
        simulation.control("DropName");
        EXPECT_EQ(listDevices(object.get()), "3/0 Adapter hci0 not found");
        // An adapter that goes after it was looked up.
        std::atomic<bool> isGone{false};
        RawPeer daemon(simulation.bus().address(), "org.bluez");
        daemon.handle("FindAdapter", [&isGone](DBusMessage* message) {
            if (isGone.exchange(true))
                return MessagePtr(dbus_message_new_error(message, "org.bluez.Error", "gone"));
            return replyTo(message, with(Path{"/org/bluez/1/hci0"}));
        });
        EXPECT_EQ(listDevices(object.get()), "3/0 Set hci0 not found");
    }
    EXPECT_EQ(listDevices(object.get()), "3/0 Server hci0 not found"); // it is gone
    EXPECT_EQ(devices, nullptr);
}

TEST_F(ServerTest, IncompleteConstructionIsLogged) {
    {
        const ScannerServer first;
        const ScannerServer second; // dbus-glib would end the process
        EXPECT_EQ(log.take(), (Texts{"server_object.cpp Failed to serve /, another object is there",
                                     "scanner_server.cpp Failed to initial the ScannerServer"}));
    }
    simulation.control("DropName");
    const ScannerServer server;
    EXPECT_EQ(log.take(), (Texts{"scanner_server.cpp Failed to initial the ScannerServer",
                                 "scanner_server.cpp failed to get manager"}));
    EXPECT_TRUE(session.hasOwner(serviceName));
}

TEST_F(ServerTest, WithoutSessionBusNothingIsServed) {
    sessionBus.kill();
    ScannerServer server;
    EXPECT_STREQ(server.getBusName(), "");
    EXPECT_STREQ(server.getConnectionName(), "");
    EXPECT_EQ(log.take(),
              (Texts{"server_object.cpp Failed to acquire com.kestrine.bluetooth, Not connected to "
                     "the bus",
                     "scanner_server.cpp Failed to initial the ScannerServer"}));
    ticks(server, 29);
    server.startLoop(); // ends by itself all the same
}

TEST_F(ServerTest, WhatStrangersTellIsBoundedAndForgesNothing) {
    const Path adapter{"/org/bluez/1/hci0"};
    simulation.control("DropName");
    RawPeer daemon(simulation.bus().address(), "org.bluez");
    daemon.reply("FindAdapter", with(adapter));
    daemon.reply("StartDiscovery");
    daemon.reply("StopDiscovery");
    const auto find = [&](const std::string& address, const Settings& properties) {
        daemon.emit(adapter.text, "org.bluez.Adapter", "DeviceFound", with(address, properties));
    };
    const RunningServer running;
    EXPECT_EQ(ask("hci0"), emptyAnswer);
    for (const char* noAddress : {"", "x", "00:11:22:33:44", "00:11:22:33:44:5g",
                                  "00-11-22-33-44-55", "00:11:22:33:44:555"})
        find(noAddress, {{"Name", "x"}});
    find(phone, {{"Name", "x;Paired: 1"},
                 {"Alias\n;Trusted: 1", "\x1b[2J\u009bK\u00e4\x7f"},
                 {"Long", std::string(4096, 'l')},
                 {"Icon", "phone"}});
    const std::string answer = askUntilListed("hci0", phone);
    EXPECT_EQ(answer, std::string("a(e(s:") + phone +
                          " s:Name: x,Paired: 1;Alias ,Trusted: 1:  [2J K\u00e4 ;Icon: phone;))");

    log.take();
    const auto invented = [](int number) {
        const std::string digits = std::to_string(1000 + number);
        return "00:66:66:66:" + digits.substr(0, 2) + ":" + digits.substr(2);
    };
    constexpr int most = 4096;
    for (int number = 0; number < most; ++number) {
        if (number == most / 2)
            find(phone, {{"Name", "heard of again"}});
        find(invented(number), {{"Name", "x"}});
    }
    const std::string full = askUntilListed("hci0", invented(most - 1).c_str());
    EXPECT_FALSE(lists(full, invented(0).c_str()));
    EXPECT_TRUE(lists(full, invented(1).c_str()));
    EXPECT_TRUE(lists(full, phone));
    find(invented(most), {{"Name", "x"}});
    EXPECT_FALSE(lists(askUntilListed("hci0", invented(most).c_str()), invented(1).c_str()));
    EXPECT_EQ(log.take(), Texts{"scanner_state.cpp More than 4096 devices were found, the "
                                "oldest are left out from now on"});
}

TEST_F(ServerTest, FindersComeAndGoWhileDevicesAreFound) {
    for (int device = 10; device < 20; ++device)
        simulation.setDevice(("00:11:22:33:55:" + std::to_string(device)).c_str(), "RSSIVariation",
                             std::uint32_t{20}, "AddDevice");
    RunningServer running;
    inThreads(4, [this](int client) {
        const char* const adapter = client % 2 == 0 ? "hci0" : "hci1";
        for (int round = 0; round < 30; ++round) {
            const char* const method = round % 5 == 4 ? "RemoveFinder" : "ListDevices";
            EXPECT_EQ(call(method, adapter).find("ERROR"), std::string::npos);
        }
    });
    comeInReach(otherDevice);
    askUntilListed("hci1", otherDevice);
}

} // namespace Bluetooth::Test
