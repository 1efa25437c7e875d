// SPDX-License-Identifier: LGPL-2.1-or-later
// The service in its own process (kesbt-scannerd), asked over the bus and by its client.

#include "scanner/scanner_test.h"

#include <bluetooth/dict_codec.h>
#include <bluetooth/scanner.h>

#include <csignal>
#include <fstream>

namespace Bluetooth::Test {

namespace {

const Texts noList{"no list"};

/// @return what the client lists: "ADDRESS Name: VALUE;Name: VALUE;" for each device
Texts list(Scanner& scanner, const char* adapterId, bool logErrors = true) {
    const std::unique_ptr<std::vector<std::pair<std::string, Dict*>>> devices(
        scanner.listDevices(adapterId, logErrors));
    if (!devices)
        return noList;
    Texts texts;
    for (const auto& [address, properties] : *devices) {
        texts.push_back(address + " " + dictConquerToString(*properties, ";"));
        delete properties;
    }
    return texts;
}

/// @return what the program wrote to its output and to its errors
std::pair<std::string, std::string> run(const std::string& argument, int status,
                                        const Texts& environment = {}) {
    Texts command{KESBT_SCANNERD};
    if (!argument.empty())
        command.push_back(argument);
    ChildProcess program(command, ChildProcess::Output::Capture, environment);
    EXPECT_EQ(program.wait(), status);
    const std::string output = program.readAll();
    return {output, program.readErrors()};
}

std::string umlauts(int count) {
    std::string text;
    while (count-- > 0)
        text += "\u00e4";
    return text;
}

} // namespace

class ServiceTest : public ScannerTest {
protected:
    void SetUp() override { startService(); }
    void TearDown() override {
        if (!service->hasEnded()) {
            EXPECT_EQ(stopService(), 0);
        }
    }
    void startService() {
        service =
            std::make_unique<ChildProcess>(Texts{KESBT_SCANNERD}, ChildProcess::Output::Capture);
        ASSERT_TRUE(session.waitForOwner(serviceName, true)) << service->readErrors();
    }
    /// Ends the service as a user would. @return its exit status
    int stopService(int signal = SIGTERM) {
        service->signal(signal);
        return service->wait();
    }

    /// @return what the system bus counts for the service's connection
    long matchRules(const std::string& caller) {
        const MessagePtr reply =
            system
                .call(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS, "org.freedesktop.DBus.Debug.Stats",
                      "GetConnectionStats", with(caller))
                .get();
        const std::string text = argumentsOf(reply.get());
        const std::string key = "e(s:MatchRules v(u:";
        const std::size_t place = text.find(key);
        EXPECT_NE(place, std::string::npos) << text;
        return place == std::string::npos ? -1 : std::stol(text.substr(place + key.size()));
    }
    long residentKiB() const {
        long pages = 0;
        std::ifstream("/proc/" + std::to_string(service->pid()) + "/statm") >> pages >> pages;
        return pages * sysconf(_SC_PAGESIZE) / 1024;
    }

    std::unique_ptr<ChildProcess> service;
};

/// The client, with a service that the bus starts, or with one that stands in.
using ScannerClientTest = ScannerTest;

TEST_F(ServiceTest, DevicesAreListedWithTheirPropertiesFromTheSecondAnswerOn) {
    Scanner scanner;
    EXPECT_EQ(list(scanner, "hci0"), Texts());
    EXPECT_EQ(starts("hci0"), 1u);
    EXPECT_EQ(starts("hci1"), 0u);
    comeInReach(phone);
    const std::string properties =
        "Address: 00:11:22:33:44:03;Class: 360;Icon: computer;RSSI: -60;Name: Phone;";
    const std::string answer = askUntilListed("hci0", phone);
    EXPECT_NE(answer.find("s:" + properties), std::string::npos) << answer;
    EXPECT_NE(answer.find("Trusted: 0;)"), std::string::npos) << answer;
    EXPECT_EQ(starts("hci0"), 1u);

    const Texts devices = list(scanner, "00:1A:7D:DA:71:10"); // by the adapter's address
    ASSERT_EQ(devices.size(), 1u);
    EXPECT_EQ(devices[0].find(phone + (" " + properties)), 0u) << devices[0];
    EXPECT_TRUE(log.take().empty());

    simulation.setDevice(phone, "Present", false);
    askUntilListed("hci0", phone, false);
    simulation.setDevice(phone, "RSSI", std::int16_t{-40});
    comeInReach(phone);
    EXPECT_NE(askUntilListed("hci0", phone).find("RSSI: -40;"), std::string::npos);
}

TEST_F(ServiceTest, DevicesThatTheDaemonKnowsAreLeftOut) {
    comeInReach(knownMouse); // is found before the phone in each round, and is known
    comeInReach(phone);
    EXPECT_FALSE(lists(askUntilListed("hci0", phone), knownMouse));

    const auto onAdapter = [&](const char* method, const RawPeer::Build& arguments) {
        return system.call("org.bluez", pathOf("hci0"), "org.bluez.Adapter", method, arguments)
            .get();
    };
    const MessagePtr created = onAdapter("CreateDevice", with(phone));
    const std::string devicePath = argumentsOf(created.get()).substr(2);
    EXPECT_FALSE(lists(ask("hci0"), phone));
    onAdapter("RemoveDevice", with(Path{devicePath}));
    askUntilListed("hci0", phone);

    // However many they are, an answer takes as many questions.
    RawPeer monitor(simulation.bus().address());
    monitor.becomeMonitor();
    const auto questions = [&] {
        monitor.forgetCalls();
        ask("hci0");
        EXPECT_TRUE(monitor.waitForCalls("ListDevices", 2)); // to each adapter, at its end
        return monitor.calls().size();
    };
    const std::size_t withOneKnown = questions();
    onAdapter("CreateDevice", with(phone));
    questions(); // what the monitor sees late of the creation is not counted
    EXPECT_EQ(questions(), withOneKnown);
}

TEST_F(ServiceTest, SignalsOfStrangersFindNothing) {
    ask("hci0");
    system.emitToEach(pathOf("hci0"), "org.bluez.Adapter", "DeviceFound",
                      with(newDevice, Settings{{"Name", "Forged"}}));
    comeInReach(phone);
    EXPECT_FALSE(lists(askUntilListed("hci0", phone), newDevice));
}

TEST_F(ServiceTest, AdaptersHaveFindersOfTheirOwn) {
    ask("hci0");
    comeInReach(otherDevice);
    askUntilListed("hci1", otherDevice);
    EXPECT_EQ(starts("hci0"), 1u);
    EXPECT_EQ(starts("hci1"), 1u);
    // Signals reach the proxies of all adapters: what one finds is told by the others too.
    askUntilListed("hci0", otherDevice);

    EXPECT_EQ(call("RemoveFinder", "hci0"), "");
    EXPECT_EQ(stops("hci0"), 1u);
    EXPECT_EQ(stops("hci1"), 0u);
    // The removed finder does not come back with what the other adapter finds.
    simulation.setDevice(newDevice, "Adapter", "hci1", "AddDevice");
    askUntilListed("hci1", newDevice);
    EXPECT_EQ(starts("hci0"), 1u);

    // The next question begins anew.
    EXPECT_EQ(ask("hci0"), emptyAnswer);
    EXPECT_EQ(starts("hci0"), 2u);
    comeInReach(phone);
    askUntilListed("hci0", phone);
}

TEST_F(ServiceTest, AnswersToWrongAndNeedlessCalls) {
    EXPECT_EQ(ask("hci9"), "ERROR Adapter hci9 not found");
    EXPECT_EQ(ask("/org/bluez/1/hci0"), "ERROR Adapter /org/bluez/1/hci0 not found");
    EXPECT_EQ(ask(""), "ERROR Adapter  not found");
    EXPECT_EQ(ask("any"), "ERROR Adapter any not found"); // the daemon has a path for it
    EXPECT_EQ(ask(umlauts(20000000).c_str()), "ERROR Adapter " + umlauts(127) + " not found");
    EXPECT_EQ(call("RemoveFinder", "hci0"), ""); // without a finder
    EXPECT_EQ(call("RemoveFinder", "hci9"),
              "ERROR Method invoked for RemoveFinder returned FALSE but did not set error");
    EXPECT_EQ(stops("hci0"), 0u);

    const MessagePtr data =
        session.call(serviceName, "/", "org.freedesktop.DBus.Introspectable", "Introspect").get();
    const std::string xml = argumentsOf(data.get());
    EXPECT_NE(xml.find("<method name=\"ListDevices\">"), std::string::npos);
    EXPECT_NE(xml.find("<method name=\"RemoveFinder\">"), std::string::npos);
    EXPECT_NE(xml.find("<arg name=\"arg1\" type=\"a{ss}\" direction=\"out\"/>"), std::string::npos)
        << xml;
}

TEST_F(ServiceTest, RoundsOfFindersLeaveRulesAndMemoryFlat) {
    const auto rounds = [this](int count) {
        for (int round = 0; round < count; ++round) {
            ASSERT_EQ(ask("hci0"), emptyAnswer);
            ASSERT_EQ(call("RemoveFinder", "hci0"), "");
        }
    };
    rounds(100);
    const std::string lastCall = simulation.calls().back();
    const std::string caller = lastCall.substr(lastCall.rfind("s:") + 2);
    const long rules = matchRules(caller);
    const long memory = residentKiB();
    rounds(isSanitized ? 200 : 1000);
    EXPECT_EQ(matchRules(caller), rules);
    // A sanitizer keeps what was freed for a while.
    if (!isSanitized) {
        EXPECT_LT(residentKiB(), memory + 256);
    }
}

TEST_F(ServiceTest, DaemonMayComeLateGoAndComeBack) {
    stopService();
    simulation.control("DropName");
    startService();
    EXPECT_EQ(ask("hci0"), "ERROR Adapter hci0 not found");
    EXPECT_EQ(call("RemoveFinder", "hci0"),
              "ERROR Method invoked for RemoveFinder returned FALSE but did not set error");
    simulation.control("RegainName");
    EXPECT_EQ(ask("hci0"), emptyAnswer);
    comeInReach(phone);
    askUntilListed("hci0", phone); // its signals are received too

    simulation.control("Restart"); // all paths change
    askUntilListed("hci0", phone);

    simulation.control("DropName");
    EXPECT_EQ(ask("hci0"), "ERROR Adapter hci0 not found");
    simulation.control("RegainName");
    askUntilListed("hci0", phone);
}

TEST_F(ServiceTest, GoesOnWhenAClientLeavesWithoutItsAnswer) {
    simulation.delayNext("org.bluez.Manager", "FindAdapter", 50);
    {
        RawPeer leaving(sessionBus.address());
        leaving.call(serviceName, "/", serviceInterface, "ListDevices", with("hci0"));
        ASSERT_TRUE(simulation.awaitCalls("s:FindAdapter "));
    }
    EXPECT_EQ(ask("hci1"), emptyAnswer);
    EXPECT_EQ(starts("hci0"), 1u); // it was carried out all the same
}

TEST_F(ServiceTest, EndsWithDiscoveryStoppedEverywhere) {
    for (const int signal : {SIGTERM, SIGINT}) {
        ask("hci0");
        ask("hci1");
        EXPECT_EQ(stopService(signal), 0);
        EXPECT_EQ(service->readAll() + service->readErrors(), "");
        startService();
    }
    EXPECT_EQ(stops("hci0"), 2u);
    EXPECT_EQ(stops("hci1"), 2u);

    // The daemon hangs, and three calls wait for it.
    ask("hci0");
    const std::string path = pathOf("hci0");
    simulation.process().signal(SIGSTOP);
    for (int caller = 0; caller < 3; ++caller)
        session.call(serviceName, "/", serviceInterface, "ListDevices", with("hci0"));
    EXPECT_TRUE(session.hasOwner(serviceName)); // the bus has passed the calls on
    service->signal(SIGTERM);
    EXPECT_EQ(service->wait(Milliseconds(2000)), 0);
    simulation.process().signal(SIGCONT);
    const MessagePtr properties =
        system.call("org.bluez", path, "org.bluez.Adapter", "GetProperties").get();
    EXPECT_NE(argumentsOf(properties.get()).find("s:Discovering v(b:0)"), std::string::npos)
        << argumentsOf(properties.get());
}

TEST_F(ServiceTest, RunsOnceInASessionAndTellsItsUsage) {
    const std::string said = run("", 1).second;
    EXPECT_EQ(said.find("kesbt-scannerd: already running in this session, as :1."), 0u) << said;
    EXPECT_EQ(said.find('\n'), said.size() - 1);
    EXPECT_EQ(ask("hci0"), emptyAnswer); // the first goes on
    EXPECT_EQ(run("--version", 0).first, "kesbt-scannerd 1.0.0\n");
    run("--help", 0);
    run("--nonsense", 2);

    stopService();
    std::ofstream(testFolder() + "/libdbus-glib-1.so.2") << "no library";
    EXPECT_EQ(run("", 1, {"LD_LIBRARY_PATH=" + testFolder()}).second,
              "kesbt-scannerd: cannot load libdbus-glib-1.so.2; install libdbus-glib-1-2\n");
}

TEST_F(ServiceTest, EndsWithItsBuses) {
    ask("hci0");
    simulation.bus().kill();
    EXPECT_EQ(service->wait(), 1);
    EXPECT_EQ(service->readAll() + service->readErrors(),
              "kesbt-scannerd: the system bus has gone; start again when it is back\n");

    simulation.bus().start();
    startService();
    ask("hci0"); // now it is past its start
    sessionBus.kill();
    EXPECT_EQ(service->wait(), 1);
    EXPECT_EQ(service->readAll() + service->readErrors(),
              "kesbt-scannerd: the session bus has gone; start again when it is back\n");

    EXPECT_EQ(run("", 1).second.find("kesbt-scannerd: cannot reach the session bus; "), 0u);
}

TEST_F(ScannerClientTest, StartsTheServiceThatIsMissing) {
    ASSERT_FALSE(session.hasOwner(serviceName));
    Scanner scanner;
    EXPECT_EQ(list(scanner, "hci0"), Texts()) << scanner.getErrorMessage();
    EXPECT_TRUE(session.hasOwner(serviceName));
    comeInReach(phone);
    askUntilListed("hci0", phone);
}

TEST_F(ScannerClientTest, GivesTheDaemonsErrorForAdaptersThatAreNot) {
    Scanner scanner;
    EXPECT_EQ(list(scanner, nullptr), noList);
    EXPECT_EQ(scanner.getErrorMessage(), "Parameter is null");
    EXPECT_EQ(list(scanner, "hci9"), noList);
    EXPECT_EQ(scanner.getErrorMessage(), "No such adapter");
    EXPECT_STREQ(scanner.getErrorName(), "org.bluez.Error.NoSuchAdapter");
    EXPECT_FALSE(scanner.removeFinder("hci9"));
    simulation.control("DropName");
    EXPECT_FALSE(scanner.removeFinder("hci0"));
    EXPECT_EQ(list(scanner, "hci0"), noList);
    EXPECT_EQ(scanner.getErrorMessage(), "The Bluetooth daemon is not running");
    EXPECT_FALSE(session.hasOwner(serviceName)); // it was not asked, and so not started
    EXPECT_EQ(log.take(), (Texts{"manager.cpp Parameter is null", "manager.cpp No such adapter",
                                 "manager.cpp No such adapter"}));
}

TEST_F(ScannerClientTest, TellsWhatTheServiceRefuses) {
    RawPeer standIn(sessionBus.address(), serviceName);
    standIn.replyError("ListDevices", "com.example.Error", "Adapter hci0 not found");
    Scanner scanner;
    EXPECT_EQ(list(scanner, "hci0", false), noList);
    EXPECT_EQ(scanner.getErrorMessage(), "Adapter hci0 not found");
    EXPECT_TRUE(log.take().empty());
    EXPECT_EQ(list(scanner, "hci0", true), noList);
    EXPECT_EQ(log.take(), Texts{"scanner.cpp Adapter hci0 not found"});

    EXPECT_TRUE(scanner.removeFinder("hci0")); // queued: the answer is not waited for
    EXPECT_FALSE(scanner.hasError());
    ASSERT_TRUE(standIn.waitForCalls("RemoveFinder", 1));
    EXPECT_EQ(standIn.callTexts().back(), "RemoveFinder! s:hci0");
}

TEST_F(ScannerClientTest, ReadsAnyAnswer) {
    RawPeer standIn(sessionBus.address(), serviceName);
    Scanner scanner;
    standIn.reply("ListDevices", with(std::int32_t{1}));
    EXPECT_EQ(list(scanner, "hci0", false), noList);
    EXPECT_EQ(scanner.getErrorMessage(), "Invalid reply format");

    standIn.reply("ListDevices", [](Writer& w) {
        w.dict("ss", [](Writer& e) {
            e.entry("B", "Name: x;tail").entry("no entry", "Name: x").entry("A", "k: 1;l: 2;");
        });
    });
    EXPECT_EQ(list(scanner, "hci0"), (Texts{"B Name: x;", "A k: 1;l: 2;"}));
    EXPECT_FALSE(scanner.hasError());
}

} // namespace Bluetooth::Test
