// The proxies with the simulated daemon, from its start to its end.

#include "support/running_loop.h"
#include "support/simulation.h"
#include "support/syslog_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/agent.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <algorithm>
#include <csignal>
#include <memory>
#include <thread>
#include <unistd.h>

namespace Bluetooth::Test {

namespace {

constexpr const char* headset = "00:11:22:33:44:01";  // JustWorks, with a sink and a control
constexpr const char* keyboard = "00:11:22:33:44:02"; // DisplayPasskey
constexpr const char* phone = "00:11:22:33:44:03";    // ConfirmPasskey
constexpr const char* receiver = "00:11:22:33:44:04"; // LegacyPin 1234
constexpr const char* speaker = "00:11:22:33:44:05";  // Vanishing
constexpr const char* laptop = "00:11:22:33:44:07";   // Unconnectable
constexpr const char* carKit = "00:11:22:33:44:08";   // EnterPasskey 424242
constexpr const char* silent = "00:11:22:33:44:99";   // NeverAnswers, added by a test

bool wasSeen(const std::string& what) {
    return seen().waitUntil([&](const Texts& events) {
        return std::find(events.begin(), events.end(), what) != events.end();
    });
}

void onProperty(RemoteObject*, const char* name, const Variant* value) {
    seen().add(std::string(name) + "=" + variantToString(*value));
}
void onFound(RemoteObject*, const char* address, const Dict* properties) {
    seen().add(std::string("found ") + address + " " + find(properties, "Name"));
}
void onDisappeared(RemoteObject*, const char* address) {
    seen().add(std::string("disappeared ") + address);
}
void onCreated(RemoteObject*, const ObjectPath* path) {
    seen().add("created " + path->str().substr(path->str().rfind('/') + 1));
}
void onRemoved(RemoteObject*, const ObjectPath* path) {
    seen().add("removed " + path->str().substr(path->str().rfind('/') + 1));
}
template <char name>
void onEvent(RemoteObject*) {
    seen().add(std::string(1, name));
}

std::string pathPart(std::string address) {
    std::replace(address.begin(), address.end(), ':', '_');
    return "dev_" + address;
}

std::string property(BluezObject& object, const char* name) {
    const std::unique_ptr<Dict> dict(object.getProperties());
    return find(dict.get(), name);
}

} // namespace

class SimulationTest : public ::testing::Test {
protected:
    void SetUp() override {
        KES_NEEDS_RECEIVE_LOOP();
        seen().clear();
        manager.reset(Manager::getManager());
        ASSERT_TRUE(manager);
        adapter.reset(manager->findAdapter("hci0"));
        ASSERT_TRUE(adapter);
        EXPECT_EQ(log.take(), Texts{});
    }

    SyslogCapture log;
    Simulation simulation;
    std::unique_ptr<Manager> manager;
    std::unique_ptr<Adapter> adapter;
};

TEST_F(SimulationTest, DevicesAreFoundCreatedUsedAndRemoved) {
    ASSERT_EQ(adapter->setPropertyChangedHandler(onProperty), 0);
    ASSERT_EQ(adapter->setDeviceFoundHandler(onFound), 0);
    ASSERT_EQ(adapter->setDeviceDisappearedHandler(onDisappeared), 0);
    ASSERT_EQ(adapter->setDeviceCreatedHandler(onCreated), 0);
    ASSERT_EQ(adapter->setDeviceRemovedHandler(onRemoved), 0);
    const RunningLoop running(*manager);
    BluezObject plain(adapter->getPath(), "org.bluez.Adapter");
    const std::unique_ptr<Dict> properties(plain.getProperties());
    std::string types;
    for (const DictEntry& entry : *properties)
        types += entry.first + std::to_string(entry.second.which()) + " ";
    EXPECT_EQ(types, "Address3 Name3 Class0 Powered2 Discoverable2 Pairable2 DiscoverableTimeout0 "
                     "PairableTimeout0 Discovering2 Devices4 UUIDs4 ");
    ASSERT_EQ(adapter->startDiscovery(), 0);
    for (const std::string& event :
         {std::string("Discovering=1"), std::string("found ") + phone + " Phone",
          std::string("found ") + keyboard + " Desk Keyboard", // its name was asked
          std::string("disappeared ") + speaker})
        EXPECT_TRUE(wasSeen(event)) << event;
    ASSERT_EQ(adapter->stopDiscovery(), 0);
    EXPECT_TRUE(wasSeen("Discovering=0"));

    const std::unique_ptr<Device> device(adapter->createDevice(headset));
    ASSERT_TRUE(device) << adapter->getErrorMessage();
    EXPECT_TRUE(wasSeen("created " + pathPart(headset)));
    EXPECT_EQ(device->setProperty("Alias", Variant(std::string("büro"))), 0);
    EXPECT_EQ(property(*device, "Alias"), "büro");
    const std::unique_ptr<Dict> services(device->discoverServices(""));
    ASSERT_TRUE(services && !services->empty());
    EXPECT_EQ((*services)[0].first.find_first_not_of("0123456789"), std::string::npos);
    EXPECT_EQ(variantToString((*services)[0].second).find("<?xml"), 0u);

    const std::unique_ptr<AudioSink> sink(AudioSink::getAudioSink(device->getPath()));
    ASSERT_EQ(sink->setConnectedHandler(onEvent<'C'>), 0);
    ASSERT_EQ(sink->setPlayingHandler(onEvent<'P'>), 0);
    bool connected = true;
    EXPECT_EQ(sink->isConnected(connected), 0);
    EXPECT_FALSE(connected);
    EXPECT_EQ(sink->connect(), 0);
    EXPECT_TRUE(wasSeen("C"));
    EXPECT_EQ(sink->isConnected(connected), 0);
    EXPECT_TRUE(connected);
    simulation.control("SetPlaying", [](Writer& w) { w("hci0")(headset)(true); });
    EXPECT_TRUE(wasSeen("P"));
    EXPECT_EQ(log.take(), Texts{});

    EXPECT_EQ(device->discoverServices("nonsense"), nullptr);
    Control noControl(adapter->getPath());
    EXPECT_EQ(noControl.isConnected(connected), -1);
    EXPECT_TRUE(connected); // left as it was
    EXPECT_EQ(log.take(), (Texts{"device.cpp Invalid arguments in method call",
                                 "control.cpp " + noControl.getErrorMessage()}));
    EXPECT_EQ(adapter->createDevice(headset), nullptr);
    EXPECT_EQ(adapter->createDevice(laptop), nullptr);
    EXPECT_EQ(log.take(), (Texts{"adapter.cpp Already Exists", "adapter.cpp Host is down"}));
    ASSERT_EQ(adapter->removeDevice(device->getPath()), 0);
    EXPECT_TRUE(wasSeen("removed " + pathPart(headset)));
    EXPECT_EQ(device->getProperties(), nullptr);
    EXPECT_EQ(log.take(), Texts{"bluez_object.cpp " + device->getErrorMessage()});
}

TEST_F(SimulationTest, ADaemonThatLeavesIsMissedAndOneThatIsBackIsUsed) {
    simulation.control("DropName");
    EXPECT_EQ(Manager::getManager(), nullptr);
    EXPECT_EQ(Adapter::getAdapter(adapter->getPath()), nullptr);
    EXPECT_EQ(log.take(), Texts{});
    EXPECT_EQ(manager->defaultAdapter(), nullptr);
    EXPECT_EQ(adapter->listDevices(), nullptr);
    EXPECT_EQ(adapter->startDiscovery(), 0); // handed to the bus
    const std::string text = "The name org.bluez was not provided by any .service files";
    EXPECT_EQ(log.take(), (Texts{"manager.cpp " + text, "adapter.cpp " + text}));
    simulation.control("RegainName");
    const std::unique_ptr<DeviceList> devices(adapter->listDevices());
    EXPECT_TRUE(devices); // the same paths as before
    simulation.control("Restart");
    EXPECT_EQ(adapter->listDevices(), nullptr); // other paths
    EXPECT_NE(log.take(), Texts{});
    const std::unique_ptr<Adapter> renewed(manager->findAdapter("hci0"));
    ASSERT_TRUE(renewed);
    EXPECT_STRNE(renewed->getPath(), adapter->getPath());
    simulation.process().kill();
    EXPECT_TRUE(simulation.peer().waitForOwner("org.bluez", false));
    EXPECT_FALSE(BluezObject::hasBluetoothd());
}

TEST_F(SimulationTest, ACallIsEndedByTheLossOfTheDaemonOrByItsErrors) {
    simulation.delayNext("org.bluez.Adapter", "ListDevices", 60000);
    simulation.watchCalls();
    std::thread dropper([&] {
        EXPECT_TRUE(simulation.awaitCalls("s:ListDevices "));
        simulation.control("DropName");
    });
    EXPECT_EQ(adapter->listDevices(), nullptr);
    dropper.join();
    EXPECT_NE(adapter->getErrorMessage(), "");
    simulation.control("RegainName");
    simulation.failNext("org.bluez.Adapter", "ListDevices", "org.bluez.Error.NotReady",
                        "Resource Not Ready");
    log.take();
    EXPECT_EQ(adapter->getDeviceByIndex(0), nullptr);
    EXPECT_EQ(log.take(), Texts{"adapter.cpp Resource Not Ready"});
}

class PairingTest : public SimulationTest {
protected:
    void SetUp() override {
        SimulationTest::SetUp();
        if (IsSkipped() || HasFatalFailure())
            return;
        ASSERT_EQ(agent.registerPath(), 0);
        ASSERT_EQ(adapter->setDeviceCreatedHandler(onCreated), 0);
        ASSERT_EQ(adapter->setDeviceRemovedHandler(onRemoved), 0);
    }
    void TearDown() override { agent.unregisterPath(); }

    std::string pair(const char* address) {
        const std::unique_ptr<Device> device(adapter->createPairedDevice(address, agent));
        if (!device)
            return adapter->getErrorMessage();
        EXPECT_EQ(property(*device, "Paired"), "1");
        const std::unique_ptr<Device> found(adapter->findDevice(address, true));
        EXPECT_TRUE(found);
        return "paired";
    }

    Agent agent;
};

TEST_F(PairingTest, EveryKindOfDeviceIsPairedOrRefusedWhileAReceiveThreadRuns) {
    const struct {
        const char* address;
        const char* capability;
        const char* passkey;
        bool reject;
        const char* result;
        std::size_t unknownRequests;
    } cases[] = {
        {receiver, Agent::PSZ_DISPLAY_YES_NO, "0000", false, "Authentication Failed", 0},
        {receiver, Agent::PSZ_DISPLAY_YES_NO, "1234", true, "paired", 0}, // PINs are given anyhow
        {phone, Agent::PSZ_DISPLAY_YES_NO, "", true, "Authentication Failed", 0},
        {phone, Agent::PSZ_DISPLAY_YES_NO, "", false, "paired", 0},
        {phone, Agent::PSZ_DISPLAY_YES_NO, "", false, "Already Exists", 0},
        {headset, Agent::PSZ_NO_INPUT_NO_OUTPUT, "", true, "paired", 0}, // nothing is asked
        {carKit, Agent::PSZ_KEYBOARD_ONLY, "424241", false, "Authentication Failed", 0},
        {carKit, Agent::PSZ_KEYBOARD_ONLY, "424242", false, "paired", 0},
        {keyboard, Agent::PSZ_DISPLAY_ONLY, "", false, "paired", 7}, // DisplayPasskey for each key
        {laptop, Agent::PSZ_DISPLAY_YES_NO, "", false, "Page Timeout", 0},
    };
    const RunningLoop running(*manager);
    for (const auto& given : cases) {
        seen().clear();
        agent.setCapability(given.capability);
        agent.setPasskeyValue(given.passkey);
        agent.setReject(given.reject);
        EXPECT_EQ(pair(given.address), given.result) << given.address;
        const bool paired = std::string(given.result) == "paired";
        Texts expected(given.unknownRequests,
                       "agent.cpp Registered agent does not provide a handler for the incoming "
                       "message.");
        if (!paired)
            expected.push_back(std::string("adapter.cpp ") + given.result);
        EXPECT_EQ(log.take(), expected) << given.address;
        if (std::string(given.result) != "Already Exists") {
            EXPECT_TRUE(wasSeen("created " + pathPart(given.address)));
            EXPECT_TRUE(paired || wasSeen("removed " + pathPart(given.address)));
        }
    }
}

TEST_F(PairingTest, AnInterruptionEndsTheWaitAndThePairingCanBeCancelled) {
    simulation.setDevice(silent, "Behaviour", "NeverAnswers", "AddDevice");
    const RunningLoop running(*manager);
    ASSERT_EQ(pair(headset), "paired"); // installs the handlers of the signals
    std::thread interrupter([&] {
        EXPECT_TRUE(wasSeen("created " + pathPart(silent)));
        kill(getpid(), SIGINT);
    });
    EXPECT_EQ(pair(silent), "Reply message is null");
    interrupter.join();
    ASSERT_EQ(adapter->cancelDeviceCreation(silent), 0);
    EXPECT_TRUE(wasSeen("removed " + pathPart(silent)));
    agent.setPasskeyValue("1234");
    EXPECT_EQ(pair(receiver), "paired"); // the late error reply is not taken for this one's
}

TEST_F(PairingTest, AnotherThreadCanCancel) {
    simulation.setDevice(silent, "Behaviour", "NeverAnswers", "AddDevice");
    const RunningLoop running(*manager);
    std::thread canceller([&] {
        EXPECT_TRUE(wasSeen("created " + pathPart(silent)));
        Adapter other(adapter->getPath());
        EXPECT_EQ(other.cancelDeviceCreation(silent), 0);
    });
    const std::string result = pair(silent);
    canceller.join();
    EXPECT_EQ(log.take(), Texts{"adapter.cpp " + result});
    EXPECT_TRUE(result == "Authentication Timeout" || result == "Page Timeout") << result;
    EXPECT_TRUE(wasSeen("removed " + pathPart(silent)));
}

TEST_F(PairingTest, TheLossOfTheDaemonOrOfTheBusEndsTheWait) {
    simulation.setDevice(silent, "Behaviour", "NeverAnswers", "AddDevice");
    const RunningLoop running(*manager);
    for (const bool wholeBus : {false, true}) {
        seen().clear();
        std::thread dropper([&] {
            EXPECT_TRUE(wasSeen("created " + pathPart(silent)));
            if (wholeBus)
                simulation.bus().kill();
            else
                simulation.control("DropName");
        });
        const std::string result = pair(silent);
        dropper.join();
        EXPECT_NE(result, "");
        EXPECT_NE(result, "paired");
        if (!wholeBus)
            simulation.control("RegainName");
    }
    log.take();
}

} // namespace Bluetooth::Test
