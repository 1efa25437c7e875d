// SPDX-License-Identifier: LGPL-2.1-or-later
// Signals of the daemon: the callbacks that a program sets, and what the default ones print.

#include "support/callbacks.h"
#include "support/peer_test.h"
#include "support/stdout_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/audio_source.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/headset.h>
#include <bluetooth/input.h>
#include <bluetooth/manager.h>
#include <bluetooth/network.h>
#include <bluetooth/serial.h>

#include <initializer_list>
#include <regex>
#include <thread>
#include <typeinfo>

namespace Bluetooth::Test {

namespace {

const Writer::Build newAdapter = with(Path{"/new"});
const Writer::Build newDevice = with(Path{devicePath});
const Writer::Build powered = with("Powered", Var{true});

void foundDevice(Writer& w) {
    w(address).dict("sv", [](Writer& d) {
        d.entry("Name", Var{"Phone"}).entry("RSSI", Var{std::int16_t{-60}});
    });
}

} // namespace

class HandlerTest : public DaemonTest {
protected:
    void SetUp() override {
        KES_NEEDS_RECEIVE_LOOP();
        seen().clear();
    }

    Manager manager;
    Adapter adapter{adapterPath};
    Device device{devicePath};
    AudioSink sink{devicePath};
    Control control{devicePath};
    Headset unit{devicePath};
    RemoteObject loop{"org.bluez", "/loop", "com.example.Loop", DBUS_BUS_SYSTEM};
};

TEST_F(HandlerTest, EachSetterSubscribesToItsSignal) {
    const RunningLoop running(loop);
    const auto check = [&](auto& proxy, const std::string& member, auto setter, auto callback,
                           const Writer::Build& arguments, const std::string& reported,
                           const std::string& printed) {
        const std::string what = std::string(proxy.getInterface()) + "." + member;
        seen().clear();
        // The default one is in front, since it subscribed last: it has printed when ours is told.
        ASSERT_EQ((proxy.*setter)(callback), 0) << what;
        ASSERT_EQ((proxy.*setter)(nullptr), 0) << what;
        StdoutCapture output;
        daemon.emit(proxy.getPath(), proxy.getInterface(), member, arguments);
        ASSERT_TRUE(seen().waitFor(1)) << what;
        const std::regex pointer("0x[0-9a-f]+");
        EXPECT_EQ(std::regex_replace(output.take(), pointer, "POINTER"), printed) << what;
        EXPECT_EQ(seen().events(), Texts{reported}) << what;
    };
    const std::string onAdapter = std::string(" ") + adapterPath;
    const std::string onDevice = std::string(" ") + devicePath;
    check(manager, "AdapterAdded", &Manager::setAdapterAddedHandler, onPath, newAdapter,
          "path / /new", "/new was added by /\n");
    check(manager, "AdapterRemoved", &Manager::setAdapterRemovedHandler, onPath, newAdapter,
          "path / /new", "/new was removed by /\n");
    check(manager, "DefaultAdapterChanged", &Manager::setDefaultAdapterChangedHandler, onPath,
          newAdapter, "path / /new", "Default adpater is /new in / now\n");
    check(adapter, "PropertyChanged", &Adapter::setPropertyChangedHandler, onVariant, powered,
          "variant" + onAdapter + " Powered=1", "Powered was changed in" + onAdapter + " with 1\n");
    check(adapter, "DeviceFound", &Adapter::setDeviceFoundHandler, onDict, foundDevice,
          "dict" + onAdapter + " 00:11:22:33:44:55 Name: Phone;RSSI: -60;",
          "00:11:22:33:44:55 was found by" + onAdapter + "\nName: Phone\nRSSI: -60\n\n");
    check(adapter, "DeviceDisappeared", &Adapter::setDeviceDisappearedHandler, onString,
          with(address), "string" + onAdapter + " 00:11:22:33:44:55",
          "00:11:22:33:44:55 was disappeared in" + onAdapter + "\n");
    check(adapter, "DeviceCreated", &Adapter::setDeviceCreatedHandler, onPath, newDevice,
          "path" + onAdapter + onDevice, "POINTER was created by" + onAdapter + "\n");
    check(adapter, "DeviceRemoved", &Adapter::setDeviceRemovedHandler, onPath, newDevice,
          "path" + onAdapter + onDevice, "POINTER was removed by" + onAdapter + "\n");
    check(control, "PropertyChanged", &Control::setPropertyChangedHandler, onVariant, powered,
          "variant" + onDevice + " Powered=1", "Powered was changed in" + onDevice + " with 1\n");
    // Without arguments a callback gets the proxy that runs the loop.
    const auto checkEvent = [&](auto& proxy, const std::string& member, auto setter,
                                const std::string& printed) {
        check(proxy, member, setter, onNothing, {}, "nothing /loop", printed + " /loop\n");
    };
    checkEvent(device, "DisconnectRequested", &Device::setDisconnectRequestedHandler,
               "Disconnect requested from");
    checkEvent(sink, "Connected", &AudioSink::setConnectedHandler, "Connected from");
    checkEvent(sink, "Disconnected", &AudioSink::setDisconnectedHandler, "Disconnected from");
    checkEvent(sink, "Playing", &AudioSink::setPlayingHandler, "Playing in");
    checkEvent(sink, "Stopped", &AudioSink::setStoppedHandler, "Stopped in");
    checkEvent(control, "Connected", &Control::setConnectedHandler, "Connected from");
    checkEvent(control, "Disconnected", &Control::setDisconnectedHandler, "Disconnected from");
    checkEvent(unit, "Connected", &Headset::setConnectedHandler, "Connected from");
    checkEvent(unit, "Disconnected", &Headset::setDisconnectedHandler, "Disconnected from");
    checkEvent(unit, "Playing", &Headset::setPlayingHandler, "Playing in");
    checkEvent(unit, "Stopped", &Headset::setStoppedHandler, "Stopped in");
    checkEvent(unit, "AnswerRequested", &Headset::setAnswerRequestedHandler,
               "Answer requested from");
    checkEvent(unit, "CallTerminated", &Headset::setCallTerminatedHandler, "Call terminated from");
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(HandlerTest, AProxyIsWholeUntilItsCallbacksOnOtherThreadsHaveEnded) {
    const RunningLoop running(loop);
    static std::thread destroyer;
    const auto destroyElsewhere = [](RemoteObject* receiver, const char*) {
        const std::string type = typeid(*receiver).name();
        destroyer = std::thread([receiver] { delete receiver; });
        Latch().wait(Milliseconds(20)); // it has got as far as it can
        seen().add(type == typeid(*receiver).name() ? "whole" : type);
    };
    const std::initializer_list<RemoteObject*> proxies{
        new BluezObject("/object", "org.bluez.Object"),
        new Manager,
        new Adapter(adapterPath),
        new Device(devicePath),
        new Audio(devicePath),
        new AudioSink(devicePath),
        new Control(devicePath),
        new Input(devicePath),
        new Network(devicePath),
        new Serial(devicePath),
        new Headset(devicePath),
        new AudioSource(devicePath)};
    for (RemoteObject* proxy : proxies) {
        ASSERT_EQ(proxy->setSignalHandlerString("Changed", destroyElsewhere), 0);
        seen().clear();
        daemon.emit(proxy->getPath(), proxy->getInterface(), "Changed", with("x"));
        ASSERT_TRUE(seen().waitFor(1));
        EXPECT_EQ(seen().events(), Texts{"whole"});
        destroyer.join();
    }
}

} // namespace Bluetooth::Test
