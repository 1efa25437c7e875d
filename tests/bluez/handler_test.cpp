// SPDX-License-Identifier: LGPL-2.1-or-later
// Signals of the daemon: the callbacks that a program sets, and what the default ones print.

#include "support/callbacks.h"
#include "support/peer_test.h"
#include "support/stdout_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/manager.h>

#include <memory>
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
    EXPECT_EQ(log.take(), Texts{});
}

TEST_F(HandlerTest, AProxyIsWholeUntilItsCallbacksOnOtherThreadsHaveEnded) {
    const RunningLoop running(loop);
    const auto check = [&](RemoteObject* proxy) {
        struct Call {
            Latch entered, leave;
            std::string type;
        };
        static std::unique_ptr<Call> call;
        call = std::make_unique<Call>();
        const std::string type = typeid(*proxy).name();
        const std::string path = proxy->getPath();
        const std::string interface = proxy->getInterface();
        ASSERT_EQ(proxy->setSignalHandlerString("Changed",
                                                [](RemoteObject* receiver, const char*) {
                                                    call->entered.open();
                                                    call->leave.wait();
                                                    call->type = typeid(*receiver).name();
                                                }),
                  0);
        daemon.emit(path, interface, "Changed", with("x"));
        ASSERT_TRUE(call->entered.wait()) << type;
        Latch destroyed;
        std::thread destroyer([&] {
            delete proxy;
            destroyed.open();
        });
        EXPECT_FALSE(destroyed.wait(Milliseconds(20))) << type; // it has got as far as it can
        call->leave.open();
        destroyer.join();
        EXPECT_EQ(call->type, type);
    };
    check(new BluezObject("/object", "org.bluez.Object"));
    check(new Manager);
    check(new Adapter(adapterPath));
    check(new Device(devicePath));
    check(new Audio(devicePath));
    check(new AudioSink(devicePath));
    check(new Control(devicePath));
}

} // namespace Bluetooth::Test
