// SPDX-License-Identifier: LGPL-2.1-or-later
// What each operation of the proxies asks the daemon, and what becomes of the answer.

#include "support/peer_test.h"

#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
#include <bluetooth/agent.h>
#include <bluetooth/audio.h>
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
#include <functional>
#include <limits>
#include <memory>

namespace Bluetooth::Test {

namespace {

using Found = std::unique_ptr<RemoteObject>;

const Writer::Build emptyArray = [](Writer& w) { w.array("u"); };

void twoPaths(Writer& w) {
    w.array("o", with(Path{"/a"}, Path{"/b"}));
}

} // namespace

class ProxyTest : public DaemonTest {
protected:
    Manager manager;
    Adapter adapter{adapterPath};
    Device device{devicePath};
};

TEST_F(ProxyTest, OperationsWithoutResultAreSentAndNotWaitedFor) {
    Agent agent;
    ASSERT_EQ(agent.registerPath(), 0);
    const std::string agentPath = agent.getPath();
    const struct {
        const char* file;
        std::string call;
        std::function<int(const char* path)> operation;
    } cases[] = {
        {"adapter", "Adapter.RequestSession!", [](auto p) { return Adapter(p).requestSession(); }},
        {"adapter", "Adapter.ReleaseSession!", [](auto p) { return Adapter(p).releaseSession(); }},
        {"adapter", "Adapter.StartDiscovery!", [](auto p) { return Adapter(p).startDiscovery(); }},
        {"adapter", "Adapter.StopDiscovery!", [](auto p) { return Adapter(p).stopDiscovery(); }},
        {"adapter", "Adapter.CancelDeviceCreation! s:any text",
         [](auto p) { return Adapter(p).cancelDeviceCreation("any text"); }},
        {"adapter", "Adapter.RemoveDevice! o:/dev",
         [](auto p) { return Adapter(p).removeDevice("/dev"); }},
        {"adapter", "Adapter.RegisterAgent! o:" + agentPath + " s:DisplayYesNo",
         [&](auto p) { return Adapter(p).registerAgent(agent); }},
        {"adapter", "Adapter.UnregisterAgent! o:" + agentPath,
         [&](auto p) { return Adapter(p).unregisterAgent(agent); }},
        {"device", "Device.CancelDiscovery!", [](auto p) { return Device(p).cancelDiscovery(); }},
        {"device", "Device.Disconnect!", [](auto p) { return Device(p).disconnect(); }},
        {"audio", "Audio.Connect!", [](auto p) { return Audio(p).connect(); }},
        {"audio", "Audio.Disconnect!", [](auto p) { return Audio(p).disconnect(); }},
        {"audio_sink", "AudioSink.Connect!", [](auto p) { return AudioSink(p).connect(); }},
        {"audio_sink", "AudioSink.Disconnect!", [](auto p) { return AudioSink(p).disconnect(); }},
        {"control", "Control.VolumeUp!", [](auto p) { return Control(p).volumeUp(); }},
        {"control", "Control.VolumeDown!", [](auto p) { return Control(p).volumeDown(); }},
        {"input", "Input.Connect!", [](auto p) { return Input(p).connect(); }},
        {"input", "Input.Disconnect!", [](auto p) { return Input(p).disconnect(); }},
        {"audio_source", "AudioSource.Connect!", [](auto p) { return AudioSource(p).connect(); }},
        {"audio_source", "AudioSource.Disconnect!",
         [](auto p) { return AudioSource(p).disconnect(); }},
        {"network", "Network.Disconnect!", [](auto p) { return Network(p).disconnect(); }},
        {"serial", "Serial.Disconnect! s:tty", [](auto p) { return Serial(p).disconnect("tty"); }},
        {"headset", "Headset.Connect!", [](auto p) { return Headset(p).connect(); }},
        {"headset", "Headset.Disconnect!", [](auto p) { return Headset(p).disconnect(); }},
        {"headset", "Headset.IndicateCall!", [](auto p) { return Headset(p).indicateCall(); }},
        {"headset", "Headset.CancelCall!", [](auto p) { return Headset(p).cancelCall(); }},
        {"headset", "Headset.Play!", [](auto p) { return Headset(p).play(); }},
        {"headset", "Headset.Stop!", [](auto p) { return Headset(p).stop(); }},
        {"headset", "Headset.SetSpeakerGain! q:7",
         [](auto p) { return Headset(p).setSpeakerGain(7); }},
        {"headset", "Headset.SetMicrophoneGain! q:8",
         [](auto p) { return Headset(p).setMicrophoneGain(8); }},
        {"bluez_object", "Device.SetProperty! s:Alias v(s:x)",
         [](auto p) { return Device(p).setProperty("Alias", Variant(std::string("x"))); }},
    };
    for (const auto& given : cases) {
        const std::size_t dot = given.call.find('.') + 1;
        EXPECT_EQ(given.operation("/some/path"), 0) << given.call;
        ASSERT_TRUE(daemon.waitForCalls(given.call.substr(dot, given.call.find('!') - dot), 1));
        const SeenCall sent = daemon.calls()[0];
        EXPECT_EQ(sent.interface + "." + sent.text(), "org.bluez." + given.call);
        EXPECT_EQ(sent.path, "/some/path");
        daemon.forgetCalls();
        EXPECT_EQ(log.take(), Texts{});
        EXPECT_EQ(given.operation("no path"), -1);
        EXPECT_EQ(log.take().front(), std::string(given.file) + ".cpp Failed to create message");
    }
    EXPECT_EQ(daemon.calls().size(), 0U);
    agent.unregisterPath();
}

TEST_F(ProxyTest, APropertyIsSetWithoutAListWhichCannotBeSentAndOnlyTheLogTells) {
    EXPECT_EQ(Control("/some/path").setProperty("N", Variant(Texts{"a"})), 0);
    ASSERT_TRUE(daemon.waitForCalls("SetProperty", 1));
    EXPECT_EQ(takeCalls(), Texts{"SetProperty! s:N"});
    EXPECT_EQ(log.take(), Texts{"bluez_object.cpp Failed to append args = iterator"});
}

TEST_F(ProxyTest, OperationsThatGiveAnObjectReadItsPath) {
    Agent agent;
    ASSERT_EQ(agent.registerPath(), 0);
    agent.setCapability(Agent::PSZ_KEYBOARD_ONLY);
    const std::string toAdapter = "org.bluez.Adapter"; // given by the manager
    const std::string toDevice = "org.bluez.Device";   // given by an adapter
    const struct {
        std::string interface;
        std::string call;
        std::function<Found()> operation;
    } cases[] = {
        {toAdapter, "DefaultAdapter", [&] { return Found(manager.defaultAdapter()); }},
        {toAdapter, "FindAdapter s:hci1", [&] { return Found(manager.findAdapter("hci1")); }},
        {toDevice, "FindDevice s:a", [&] { return Found(adapter.findDevice("a", true)); }},
        {toDevice, "CreateDevice s:a", [&] { return Found(adapter.createDevice("a")); }},
        {toDevice, std::string("CreatePairedDevice s:a o:") + agent.getPath() + " s:KeyboardOnly",
         [&] { return Found(adapter.createPairedDevice("a", agent)); }},
    };
    for (const auto& given : cases) {
        const std::string method = given.call.substr(0, given.call.find(' '));
        const std::string place = given.interface == toAdapter ? "manager.cpp " : "adapter.cpp ";
        daemon.reply(method, with(Path{"/new"}));
        const Found found = given.operation();
        ASSERT_TRUE(found) << method;
        EXPECT_STREQ(found->getPath(), "/new");
        EXPECT_EQ(found->getInterface(), given.interface);
        EXPECT_STREQ(found->getDestination(), "org.bluez");
        EXPECT_EQ(takeCalls(), Texts{given.call});
        EXPECT_EQ(log.take(), Texts{});

        daemon.replyError(method, "org.bluez.Error.Failed", "Nothing there");
        EXPECT_FALSE(given.operation());
        EXPECT_EQ(log.take(), Texts{place + "Nothing there"});
        daemon.reply(method, with("said in a text"));
        EXPECT_FALSE(given.operation());
        EXPECT_EQ(log.take(), Texts{place + "said in a text"});
        for (const auto& bad : {Writer::Build(), with(7U), emptyArray}) {
            daemon.reply(method, bad);
            EXPECT_FALSE(given.operation());
            EXPECT_EQ(log.take(), Texts{place});
        }
        // The daemon may be gone by the time its answer is used.
        daemon.handle(method, [&](DBusMessage* request) {
            daemon.disown("org.bluez");
            return replyTo(request, with(Path{"/new"}));
        });
        EXPECT_FALSE(given.operation());
        EXPECT_EQ(log.take(), Texts{});
        ASSERT_TRUE(daemon.own("org.bluez"));
        daemon.forgetCalls();
    }
    agent.unregisterPath();
}

TEST_F(ProxyTest, OperationsThatReadAValueLeaveItAloneOnFailure) {
    const auto check = [&](const std::string& file, const std::string& call, auto value,
                           auto operation) {
        const std::size_t dot = call.find('.') + 1;
        const std::string method = call.substr(dot, call.find(' ') - dot);
        daemon.reply(method, with(value));
        auto read = decltype(value){};
        EXPECT_EQ(operation(read), 0) << call;
        const SeenCall sent = daemon.calls().at(0);
        EXPECT_EQ(sent.interface + "." + sent.text(), "org.bluez." + call);
        EXPECT_EQ(log.take(), Texts{});
        daemon.replyError(method, "org.bluez.Error.Failed", "Broken");
        EXPECT_EQ(operation(read), -1) << call;
        EXPECT_EQ(read, value) << call;
        EXPECT_EQ(log.take(), Texts{file + ".cpp Broken"});
        daemon.forgetCalls();
    };
    AudioSink sink(devicePath);
    Control control(devicePath);
    Headset headset(devicePath);
    Network network(devicePath);
    Serial serial(devicePath);
    const auto gain = std::uint16_t{15};
    const std::string name = "bnep0";
    check("audio_sink", "AudioSink.IsConnected", true,
          [&](auto& v) { return sink.isConnected(v); });
    check("control", "Control.IsConnected", true, [&](auto& v) { return control.isConnected(v); });
    check("headset", "Headset.IsConnected", true, [&](auto& v) { return headset.isConnected(v); });
    check("headset", "Headset.IsPlaying", true, [&](auto& v) { return headset.isPlaying(v); });
    check("headset", "Headset.GetSpeakerGain", gain,
          [&](auto& v) { return headset.getSpeakerGain(v); });
    check("headset", "Headset.GetMicrophoneGain", gain,
          [&](auto& v) { return headset.getMicrophoneGain(v); });
    check("network", "Network.Connect s:nap", name,
          [&](auto& v) { return network.connect("nap", v); });
    check("serial", "Serial.Connect s:spp", name,
          [&](auto& v) { return serial.connect("spp", v); });
}

TEST_F(ProxyTest, UnusableArgumentsAreLoggedAndNothingIsSent) {
    const Agent unregistered;
    const std::string null = ".cpp Parameter is null";
    const std::string noPath = "adapter.cpp Invalid path";
    const std::pair<std::function<bool()>, std::string> cases[] = {
        {[&] { return !manager.findAdapter(nullptr); }, "manager" + null},
        {[&] { return !adapter.createDevice(nullptr); }, "adapter" + null},
        {[&] { return !adapter.findDevice("\xff", true); },
         "adapter.cpp Failed to append args to message"},
        {[&] { return adapter.cancelDeviceCreation(nullptr) == -1; }, "adapter" + null},
        {[&] { return adapter.removeDevice(address) == -1; }, noPath},
        {[&] { return adapter.removeDevice(nullptr) == -1; }, noPath},
        {[&] { return adapter.registerAgent(unregistered) == -1; }, noPath},
        {[&] { return !adapter.createPairedDevice(address, unregistered); }, noPath},
        {[&] { return !device.discoverServices(nullptr); }, "device" + null},
        {[&] { return device.setProperty(nullptr, Variant(true)) == -1; }, "bluez_object" + null},
        {[&] { return device.setProperty("Alias", Variant(std::string("\xff"))) == -1; },
         "bluez_object.cpp Failed to append args = iterator"}};
    for (const auto& [isRefused, line] : cases) {
        EXPECT_TRUE(isRefused()) << line;
        EXPECT_EQ(log.take(), Texts{line});
    }
    EXPECT_EQ(daemon.calls().size(), 0u);
}

TEST_F(ProxyTest, DictionariesAreGivenWholeOrNotAtAll) {
    const std::string longText(2000, 'x'); // is logged whole
    const struct {
        std::string place;
        std::string call;
        std::function<Dict*()> ask;
    } cases[] = {
        {"bluez_object.cpp ", "GetProperties", [&] { return manager.getProperties(); }},
        {"device.cpp ", "DiscoverServices s:0x110b",
         [&] { return device.discoverServices("0x110b"); }},
    };
    for (const auto& [place, call, ask] : cases) {
        const std::string method = call.substr(0, call.find(' '));
        daemon.reply(method, [](Writer& w) {
            w.dict("us", [](Writer& d) { d.entry(65536u, "<a/>").entry(65537u, "<b/>"); });
        });
        const std::unique_ptr<Dict> dict(ask());
        ASSERT_TRUE(dict);
        EXPECT_EQ(dictConquerToString(*dict, ";"), "65536: <a/>;65537: <b/>;");
        EXPECT_EQ(takeCalls(), Texts{call});
        daemon.reply(method, [](Writer& w) { w.dict("us"); });
        const std::unique_ptr<Dict> empty(ask());
        ASSERT_TRUE(empty);
        EXPECT_TRUE(empty->empty());
        EXPECT_EQ(log.take(), Texts{});

        daemon.reply(method, [](Writer& w) {
            w.dict("sv", [](Writer& d) { d.entry("good", Var{1u}).entry("bad", Var{1.5}); });
        });
        EXPECT_EQ(ask(), nullptr);
        daemon.reply(method, with("text"));
        EXPECT_EQ(ask(), nullptr);
        daemon.replyError(method, "org.bluez.Error.NotReady", longText.c_str());
        EXPECT_EQ(ask(), nullptr);
        EXPECT_EQ(log.take(), (Texts{place + "Invalid reply value", place + "Invalid reply format",
                                     place + longText}));
        daemon.forgetCalls();
    }
    EXPECT_EQ(device.getErrorMessage(), longText); // left for the caller to read
}

TEST_F(ProxyTest, AnIndexPastTheEndMeansTheDefaultAdapterButNoDevice) {
    daemon.reply("ListAdapters", twoPaths);
    daemon.reply("DefaultAdapter", with(Path{"/default"}));
    const std::pair<unsigned int, const char*> places[] = {
        {0, "/a"}, {1, "/b"}, {2, "/default"}, {std::numeric_limits<unsigned>::max(), "/default"}};
    for (const auto& [index, path] : places) {
        const Found found(manager.getAdapterByIndex(index));
        ASSERT_TRUE(found);
        EXPECT_STREQ(found->getPath(), path);
    }
    EXPECT_EQ(takeCalls(), (Texts{"ListAdapters", "ListAdapters", "ListAdapters", "DefaultAdapter",
                                  "ListAdapters", "DefaultAdapter"}));
    EXPECT_EQ(log.take(), Texts{});
    // A fallback that fails is logged by both.
    daemon.replyError("DefaultAdapter", "org.bluez.Error.NoSuchAdapter", "No such adapter");
    EXPECT_EQ(manager.getAdapterByIndex(2), nullptr);
    EXPECT_EQ(log.take(), (Texts{"manager.cpp No such adapter", "manager.cpp No such adapter"}));
    daemon.reply("ListAdapters", with("text"));
    EXPECT_EQ(manager.getAdapterByIndex(0), nullptr);
    EXPECT_EQ(log.take(), Texts{"manager.cpp Invalid reply value"});

    daemon.reply("ListDevices", twoPaths);
    const Found second(adapter.getDeviceByIndex(1));
    ASSERT_TRUE(second);
    EXPECT_STREQ(second->getPath(), "/b");
    EXPECT_EQ(adapter.getDeviceByIndex(2), nullptr);
    EXPECT_EQ(log.take(), Texts{});
    daemon.replyError("ListDevices", "org.bluez.Error.Failed", "Broken");
    EXPECT_EQ(adapter.getDeviceByIndex(0), nullptr);
    EXPECT_EQ(log.take(), Texts{"adapter.cpp Broken"});
}

TEST_F(ProxyTest, ListingAdaptersNeitherLogsNorForgetsAnEarlierError) {
    daemon.replyError("FindAdapter", "org.bluez.Error.NoSuchAdapter", "No such adapter");
    daemon.reply("ListAdapters", twoPaths);
    EXPECT_EQ(manager.findAdapter("hci9"), nullptr);
    log.take();
    const std::unique_ptr<AdapterList> list(manager.listAdapters());
    ASSERT_TRUE(list);
    ASSERT_EQ(list->size(), 2u);
    EXPECT_STREQ((*list)[0]->getPath(), "/a");
    EXPECT_STREQ((*list)[1]->getPath(), "/b");
    EXPECT_EQ(manager.getErrorMessage(), "No such adapter");
    for (const auto& bad : {Writer::Build(), with(7U)}) {
        daemon.reply("ListAdapters", bad);
        EXPECT_EQ(manager.listAdapters(), nullptr);
    }
    daemon.reply("ListAdapters", emptyArray); // of any type, is a list
    EXPECT_TRUE(std::unique_ptr<AdapterList>(manager.listAdapters()));
    daemon.replyError("ListAdapters", "org.bluez.Error.Failed", "Broken");
    EXPECT_EQ(manager.listAdapters(), nullptr);
    EXPECT_EQ(manager.getErrorMessage(), "Broken");
    EXPECT_EQ(log.take(), Texts{});

    daemon.reply("ListDevices", emptyArray);
    const std::unique_ptr<DeviceList> devices(adapter.listDevices());
    ASSERT_TRUE(devices);
    EXPECT_TRUE(devices->empty());
    daemon.replyError("ListDevices", "org.bluez.Error.Failed", "Broken");
    EXPECT_EQ(adapter.listDevices(), nullptr); // unlike adapters, this is logged
    EXPECT_EQ(log.take(), Texts{"adapter.cpp Broken"});
    daemon.replyError("FindDevice", "org.bluez.Error.DoesNotExist", "Does Not Exist");
    EXPECT_EQ(adapter.findDevice(address, false), nullptr); // this only when it is asked for
    EXPECT_EQ(log.take(), Texts{});
    EXPECT_EQ(adapter.getErrorMessage(), "Does Not Exist");
}

TEST_F(ProxyTest, ListsAskForEachElementWhetherTheDaemonIsThere) {
    constexpr std::size_t count = 130; // more than are asked for at a time
    daemon.reply("ListDevices", [](Writer& w) {
        w.array("o", [](Writer& paths) {
            for (std::size_t i = 0; i < count; ++i)
                with(Path{"/d" + std::to_string(i)})(paths);
        });
    });
    RawPeer monitor(bus.address());
    monitor.becomeMonitor();
    const std::unique_ptr<DeviceList> devices(adapter.listDevices());
    ASSERT_TRUE(devices && devices->size() == count);
    for (std::size_t i = 0; i < count; ++i)
        EXPECT_EQ((*devices)[i]->getPath(), "/d" + std::to_string(i));
    ASSERT_TRUE(monitor.waitForCalls("ListNames", count));
    Texts calls;
    for (const SeenCall& seen : monitor.calls())
        calls.push_back(seen.destination + " " + seen.text());
    Texts expected(count + 1, "org.freedesktop.DBus ListNames");
    expected.front() = "org.bluez ListDevices";
    EXPECT_EQ(calls, expected);
}

TEST(ListTest, EachQuestionThatTheBusRefusesIsLogged) {
    SyslogCapture log;
    const PrivateBus bus(
        PrivateBus::Kind::System,
        "<policy context=\"mandatory\"><deny send_interface=\"org.freedesktop.DBus\" "
        "send_member=\"ListNames\"/></policy>");
    RawPeer daemon(bus.address(), "org.bluez");
    daemon.reply("ListDevices", twoPaths);
    const std::unique_ptr<DeviceList> devices(Adapter(adapterPath).listDevices());
    ASSERT_TRUE(devices);
    EXPECT_EQ(std::count(devices->begin(), devices->end(), nullptr), 2);
    const Texts lines = log.take();
    ASSERT_EQ(lines.size(), 2u);
    for (const std::string& line : lines)
        EXPECT_EQ(line.rfind("dbus_object.cpp Rejected send message", 0), 0u) << line;
}

TEST_F(ProxyTest, ListsHoldNullsForADaemonThatLeftAndSkipThemWhenDeleted) {
    const auto leaving = [&](DBusMessage* request) {
        daemon.disown("org.bluez");
        return replyTo(request, twoPaths);
    };
    daemon.handle("ListAdapters", leaving);
    daemon.handle("ListDevices", leaving);
    std::unique_ptr<AdapterList> adapters(manager.listAdapters());
    ASSERT_TRUE(daemon.own("org.bluez"));
    const std::unique_ptr<DeviceList> devices(adapter.listDevices());
    ASSERT_TRUE(adapters && devices);
    EXPECT_EQ(adapters->size() + devices->size(), 4u);
    EXPECT_EQ(std::count(adapters->begin(), adapters->end(), nullptr), 2);
    EXPECT_EQ(std::count(devices->begin(), devices->end(), nullptr), 2);
    EXPECT_EQ(log.take(), Texts{});
    // Elements taken out are the caller's.
    adapters->push_back(new Adapter("/kept"));
    const std::unique_ptr<Adapter> kept(adapters->back());
    adapters->back() = nullptr;
    adapters.reset();
    EXPECT_STREQ(kept->getPath(), "/kept");
}

TEST_F(ProxyTest, FactoriesAskWhetherTheDaemonIsThereByItsExactName) {
    const std::pair<std::function<Found()>, std::string> factories[] = {
        {[] { return Found(Manager::getManager()); }, "/"},
        {[] { return Found(Adapter::getAdapter(adapterPath)); }, adapterPath},
        {[] { return Found(Device::getDevice(devicePath)); }, devicePath},
        {[] { return Found(Audio::getAudio(devicePath)); }, devicePath},
        {[] { return Found(AudioSink::getAudioSink(devicePath)); }, devicePath},
        {[] { return Found(Control::getControl(devicePath)); }, devicePath},
        {[] { return Found(Input::getInput(devicePath)); }, devicePath},
        {[] { return Found(Network::getNetwork(devicePath)); }, devicePath},
        {[] { return Found(Serial::getSerial(devicePath)); }, devicePath},
        {[] { return Found(Headset::getHeadset(devicePath)); }, devicePath},
        {[] { return Found(AudioSource::getAudioSource(devicePath)); }, devicePath}};
    EXPECT_TRUE(BluezObject::hasBluetoothd());
    for (const auto& [make, path] : factories)
        EXPECT_EQ(make()->getPath(), path);
    daemon.disown("org.bluez");
    for (const char* other : {"org.bluez.obex", "org.Bluez", "org.blue"})
        ASSERT_TRUE(daemon.own(other));
    EXPECT_FALSE(BluezObject::hasBluetoothd());
    for (const auto& [make, path] : factories)
        EXPECT_FALSE(make()) << path;
    EXPECT_EQ(log.take(), Texts{});
    ASSERT_TRUE(daemon.own("org.bluez"));
    EXPECT_TRUE(BluezObject::hasBluetoothd()); // nothing is remembered

    bus.kill();
    EXPECT_FALSE(BluezObject::hasBluetoothd());
    EXPECT_FALSE(factories[0].first());
}

} // namespace Bluetooth::Test
