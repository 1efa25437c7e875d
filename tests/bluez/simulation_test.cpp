// SPDX-License-Identifier: LGPL-2.1-or-later
// The proxies with the simulated daemon, from its start to its end.

#include "support/callbacks.h"
#include "support/devices.h"
#include "support/running_loop.h"
#include "support/simulation.h"
#include "support/syslog_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/agent.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/audio_source.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/headset.h>
#include <bluetooth/input.h>
#include <bluetooth/manager.h>
#include <bluetooth/network.h>
#include <bluetooth/serial.h>

#include <algorithm>
#include <csignal>
#include <functional>
#include <memory>
#include <thread>
#include <unistd.h>

namespace Bluetooth::Test {

namespace {

/// Waits for a callback's report that has this in it.
bool wasSeen(const std::string& part) {
    return seen().waitUntil([&](const Texts& events) {
        return std::any_of(events.begin(), events.end(), [&](const std::string& event) {
            return event.find(part) != std::string::npos;
        });
    });
}

void onCreated(RemoteObject*, const ObjectPath* path) {
    seen().add("created " + path->str().substr(path->str().rfind('/') + 1));
}
void onRemoved(RemoteObject*, const ObjectPath* path) {
    seen().add("removed " + path->str().substr(path->str().rfind('/') + 1));
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
    explicit SimulationTest(const std::string& scenario = "") : simulation(scenario) {}
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
    ASSERT_EQ(adapter->setPropertyChangedHandler(onVariant), 0);
    ASSERT_EQ(adapter->setDeviceFoundHandler(onDict), 0);
    ASSERT_EQ(adapter->setDeviceDisappearedHandler(onString), 0);
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
    EXPECT_TRUE(wasSeen(" Discovering=1"));
    EXPECT_TRUE(wasSeen("RSSI: -55;Name: Desk Keyboard;")); // its name was asked for
    EXPECT_TRUE(wasSeen(std::string("string ") + adapter->getPath() + " " + vanishingSpeaker));
    ASSERT_EQ(adapter->stopDiscovery(), 0);
    EXPECT_TRUE(wasSeen(" Discovering=0"));

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
    ASSERT_EQ(sink->setConnectedHandler(onNothing), 0);
    bool connected = true;
    EXPECT_EQ(sink->isConnected(connected), 0);
    EXPECT_FALSE(connected);
    EXPECT_EQ(sink->connect(), 0);
    EXPECT_TRUE(wasSeen("nothing /"));
    EXPECT_EQ(sink->isConnected(connected), 0);
    EXPECT_TRUE(connected);
    EXPECT_EQ(log.take(), Texts{});

    EXPECT_EQ(device->discoverServices("nonsense"), nullptr);
    Control noControl(adapter->getPath());
    EXPECT_EQ(noControl.isConnected(connected), -1);
    EXPECT_TRUE(connected); // left as it was
    EXPECT_EQ(log.take(), (Texts{"device.cpp Invalid arguments in method call",
                                 "control.cpp " + noControl.getErrorMessage()}));
    EXPECT_EQ(adapter->createDevice(headset), nullptr);
    EXPECT_EQ(adapter->createDevice(unreachableLaptop), nullptr);
    EXPECT_EQ(log.take(), (Texts{"adapter.cpp Already Exists", "adapter.cpp Host is down"}));
    ASSERT_EQ(adapter->removeDevice(device->getPath()), 0);
    EXPECT_TRUE(wasSeen("removed " + pathPart(headset)));
    EXPECT_EQ(device->getProperties(), nullptr);
    EXPECT_EQ(log.take(), Texts{"bluez_object.cpp " + device->getErrorMessage()});
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
    EXPECT_EQ(log.take(), Texts{"adapter.cpp " + adapter->getErrorMessage()});
    EXPECT_EQ(manager->defaultAdapter(), nullptr);
    EXPECT_EQ(log.take(), Texts{"manager.cpp The name org.bluez was not provided by any .service "
                                "files"});
    EXPECT_EQ(adapter->startDiscovery(), 0); // handed to the bus
    simulation.control("RegainName");
    simulation.failNext("org.bluez.Adapter", "ListDevices", "org.bluez.Error.NotReady",
                        "Resource Not Ready");
    EXPECT_EQ(adapter->getDeviceByIndex(0), nullptr);
    EXPECT_EQ(log.take(), Texts{"adapter.cpp Resource Not Ready"});
}

TEST_F(SimulationTest, ADaemonThatIsBackIsUsedAtItsNewPaths) {
    simulation.control("DropName");
    simulation.control("RegainName");
    EXPECT_TRUE(std::unique_ptr<DeviceList>(adapter->listDevices())); // the same paths as before
    simulation.control("Restart");
    EXPECT_EQ(adapter->listDevices(), nullptr);
    EXPECT_NE(log.take(), Texts{});
    const std::unique_ptr<Adapter> renewed(manager->findAdapter("hci0"));
    ASSERT_TRUE(renewed);
    EXPECT_STRNE(renewed->getPath(), adapter->getPath());
}

class OfferTest : public SimulationTest {
protected:
    OfferTest()
        : SimulationTest(std::string("[Audio]\nEnable=Source\nSCORouting=PCM\n"
                                     "[Adapter hci0]\nAddress=") +
                         adapter0 + "\n[Device " + newDevice +
                         "]\nName=All\nUUIDs=1101;1108;110a;1116;1124\nDocumentedNetwork=true\n") {}
};

TEST_F(OfferTest, AllThatADeviceOffersIsConnectedUsedAndDisconnected) {
    const std::unique_ptr<Device> device(adapter->createDevice(newDevice));
    ASSERT_TRUE(device) << adapter->getErrorMessage();
    const char* path = device->getPath();
    Input input(path);
    Network network(path);
    Serial serial(path);
    Headset unit(path);
    AudioSource source(path);
    for (BluezObject* each :
         std::initializer_list<BluezObject*>{device.get(), &input, &network, &unit, &source})
        ASSERT_EQ(each->setPropertyChangedHandler(
                      [](RemoteObject* sender, const char* name, const Variant* value) {
                          seen().add(std::string(sender->getInterface()) + " " + name + "=" +
                                     variantToString(*value));
                      }),
                  0);
    const RunningLoop running(*manager);
    std::string name;
    unsigned short gain = 0;
    bool yes = false;

    EXPECT_EQ(input.connect(), 0);
    EXPECT_TRUE(wasSeen("Input Connected=1"));
    EXPECT_EQ(input.disconnect(), 0);
    EXPECT_TRUE(wasSeen("Input Connected=0"));

    EXPECT_EQ(network.connect("nap", name), 0) << network.getErrorMessage();
    EXPECT_EQ(name, property(network, "Interface"));
    EXPECT_EQ(network.disconnect(), 0);
    EXPECT_TRUE(wasSeen("Network Connected=0"));

    EXPECT_EQ(serial.connect("spp", name), 0) << serial.getErrorMessage();
    EXPECT_EQ(access(name.c_str(), R_OK | W_OK), 0) << name;
    EXPECT_EQ(serial.disconnect(name.c_str()), 0);
    EXPECT_EQ(property(*device, "Alias"), property(*device, "Name")); // the daemon has done it
    EXPECT_NE(access(name.c_str(), F_OK), 0);

    EXPECT_EQ(unit.connect(), 0);
    EXPECT_TRUE(wasSeen("Headset Connected=1"));
    EXPECT_TRUE(unit.isConnected(yes) == 0 && yes);
    EXPECT_EQ(unit.indicateCall() + unit.cancelCall(), 0);
    EXPECT_TRUE(unit.getSpeakerGain(gain) == 0 && gain == 15);
    EXPECT_EQ(unit.setSpeakerGain(7) + unit.setMicrophoneGain(8), 0);
    EXPECT_TRUE(wasSeen("Headset SpeakerGain=7") && wasSeen("Headset MicrophoneGain=8"));
    EXPECT_TRUE(unit.getMicrophoneGain(gain) == 0 && gain == 8);
    EXPECT_EQ(unit.play(), 0);
    EXPECT_TRUE(wasSeen("Headset Playing=1"));
    EXPECT_TRUE(unit.isPlaying(yes) == 0 && yes);
    EXPECT_EQ(unit.stop(), 0);
    EXPECT_TRUE(wasSeen("Headset Playing=0"));
    EXPECT_EQ(unit.disconnect(), 0);
    EXPECT_TRUE(wasSeen("Headset Connected=0"));

    EXPECT_EQ(source.connect(), 0);
    EXPECT_TRUE(wasSeen("AudioSource State=connected"));
    EXPECT_EQ(source.disconnect(), 0);
    EXPECT_TRUE(wasSeen("AudioSource State=disconnected"));
    EXPECT_EQ(device->disconnect(), 0);
    EXPECT_TRUE(wasSeen("Device Connected=0"));
    EXPECT_EQ(log.take(), Texts{});
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
        simulation.setDevice(silentDevice, "Behaviour", "NeverAnswers", "AddDevice");
        running = std::make_unique<RunningLoop>(*manager);
    }
    void TearDown() override { agent.unregisterPath(); }

    /// @return "paired" or what the adapter says
    std::string pair(const char* address) {
        const std::unique_ptr<Device> device(adapter->createPairedDevice(address, agent));
        if (!device)
            return adapter->getErrorMessage();
        EXPECT_EQ(property(*device, "Paired"), "1");
        const std::unique_ptr<Device> found(adapter->findDevice(address, true));
        EXPECT_TRUE(found);
        return "paired";
    }
    /// Pairs with a device that does not answer, while something else ends this.
    std::string pairUntil(const std::function<void()>& end) {
        seen().clear();
        std::thread ending([&] {
            EXPECT_TRUE(wasSeen("created " + pathPart(silentDevice)));
            end();
        });
        const std::string result = pair(silentDevice);
        ending.join();
        return result;
    }

    Agent agent;
    std::unique_ptr<RunningLoop> running;
};

TEST_F(PairingTest, EveryKindOfDeviceIsPairedOrRefusedWhileAReceiveThreadRuns) {
    const std::string failed = "Authentication Failed";
    const struct {
        const char* address;
        const char* capability;
        const char* passkey;
        bool reject;
        std::string result;
        std::size_t unknownRequests;
    } cases[] = {
        {pinReceiver, Agent::PSZ_DISPLAY_YES_NO, "0000", false, failed, 0},
        {pinReceiver, Agent::PSZ_DISPLAY_YES_NO, "1234", true, "paired", 0}, // gives PINs anyhow
        {phone, Agent::PSZ_DISPLAY_YES_NO, "", true, failed, 0},
        {carKit, Agent::PSZ_KEYBOARD_ONLY, "424241", false, failed, 0},
        {keyboard, Agent::PSZ_DISPLAY_ONLY, "", false, "paired", 1}, // DisplayPasskey
        {unreachableLaptop, Agent::PSZ_DISPLAY_YES_NO, "", false, "Page Timeout", 0},
    };
    for (const auto& given : cases) {
        seen().clear();
        agent.setCapability(given.capability);
        agent.setPasskeyValue(given.passkey);
        agent.setReject(given.reject);
        EXPECT_EQ(pair(given.address), given.result) << given.address;
        Texts expected(given.unknownRequests,
                       "agent.cpp Registered agent does not provide a handler for the incoming "
                       "message.");
        const bool isPaired = given.result == "paired";
        if (!isPaired)
            expected.push_back("adapter.cpp " + given.result);
        EXPECT_EQ(log.take(), expected) << given.address;
        EXPECT_TRUE(wasSeen("created " + pathPart(given.address)));
        EXPECT_TRUE(isPaired || wasSeen("removed " + pathPart(given.address)));
    }
}

TEST_F(PairingTest, AnInterruptionEndsTheWaitAndThePairingCanBeCancelled) {
    ASSERT_EQ(pair(headset), "paired"); // installs the handlers of the signals
    EXPECT_EQ(pairUntil([] { kill(getpid(), SIGINT); }), "Reply message is null");
    ASSERT_EQ(adapter->cancelDeviceCreation(silentDevice), 0);
    EXPECT_TRUE(wasSeen("removed " + pathPart(silentDevice)));
    agent.setPasskeyValue("1234");
    EXPECT_EQ(pair(pinReceiver), "paired"); // the late error reply is not taken for this one's
}

TEST_F(PairingTest, AnotherThreadOrTheLossOfTheDaemonOrOfTheBusEndsTheWait) {
    const std::string cancelled = pairUntil(
        [this] { EXPECT_EQ(Adapter(adapter->getPath()).cancelDeviceCreation(silentDevice), 0); });
    EXPECT_EQ(log.take(), Texts{"adapter.cpp " + cancelled});
    EXPECT_TRUE(cancelled == "Authentication Timeout" || cancelled == "Page Timeout") << cancelled;
    EXPECT_TRUE(wasSeen("removed " + pathPart(silentDevice)));

    const std::string dropped = pairUntil([this] { simulation.control("DropName"); });
    simulation.control("RegainName");
    for (const std::string& result : {dropped, pairUntil([this] { simulation.bus().kill(); })})
        EXPECT_TRUE(!result.empty() && result != "paired") << result;
    EXPECT_NE(log.take(), Texts{});
}

} // namespace Bluetooth::Test
