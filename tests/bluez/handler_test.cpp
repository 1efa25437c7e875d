// Signals of the daemon: the callbacks that a program sets, and what the default ones print.

#include "support/peer_test.h"
#include "support/stdout_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <functional>
#include <regex>

namespace Bluetooth::Test {

namespace {

void onSignal(RemoteObject* receiver) {
    seen().add(receiver->getPath());
}
void onPath(RemoteObject* receiver, const ObjectPath* path) {
    seen().add(receiver->getPath() + (" " + path->str()));
}
void onText(RemoteObject* receiver, const char* text) {
    seen().add(receiver->getPath() + (" " + std::string(text)));
}
void onProperty(RemoteObject* receiver, const char* name, const Variant* value) {
    seen().add(receiver->getPath() + (" " + std::string(name)) + "=" + variantToString(*value));
}
void onDevice(RemoteObject* receiver, const char* text, const Dict* dict) {
    seen().add(receiver->getPath() + (" " + std::string(text)) + " " +
               dictConquerToString(*dict, ";"));
}

void newAdapter(Writer& w) {
    w(Path{"/new"});
}
void newDevice(Writer& w) {
    w(Path{devicePath});
}
void powered(Writer& w) {
    w("Powered")(Var{true});
}
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
    // Each setter is called with a callback of ours, and with null for the default one.
    using Set = std::function<int(bool own)>;
    const auto set = [](auto& proxy, auto setter, auto callback) {
        return Set([&proxy, setter, callback](bool own) {
            return (proxy.*setter)(own ? callback : nullptr);
        });
    };
    const std::string onAdapter = std::string(" by ") + adapterPath + "\n";
    const std::string path(devicePath);
    const struct {
        RemoteObject& proxy;
        const char* member;
        Writer::Build arguments;
        Set set;
        std::string reported;
        std::string printed;
    } cases[] = {
        {manager, "AdapterAdded", newAdapter,
         set(manager, &Manager::setAdapterAddedHandler, onPath), "/ /new", "/new was added by /\n"},
        {manager, "AdapterRemoved", newAdapter,
         set(manager, &Manager::setAdapterRemovedHandler, onPath), "/ /new",
         "/new was removed by /\n"},
        {manager, "DefaultAdapterChanged", newAdapter,
         set(manager, &Manager::setDefaultAdapterChangedHandler, onPath), "/ /new",
         "Default adpater is /new in / now\n"},
        {adapter, "PropertyChanged", powered,
         set(adapter, &Adapter::setPropertyChangedHandler, onProperty),
         "/org/bluez/42/hci0 Powered=1", "Powered was changed in /org/bluez/42/hci0 with 1\n"},
        {adapter, "DeviceFound", foundDevice,
         set(adapter, &Adapter::setDeviceFoundHandler, onDevice),
         "/org/bluez/42/hci0 00:11:22:33:44:55 Name: Phone;RSSI: -60;",
         "00:11:22:33:44:55 was found" + onAdapter + "Name: Phone\nRSSI: -60\n\n"},
        {adapter, "DeviceDisappeared", [](Writer& w) { w(address); },
         set(adapter, &Adapter::setDeviceDisappearedHandler, onText),
         "/org/bluez/42/hci0 00:11:22:33:44:55",
         "00:11:22:33:44:55 was disappeared in /org/bluez/42/hci0\n"},
        {adapter, "DeviceCreated", newDevice,
         set(adapter, &Adapter::setDeviceCreatedHandler, onPath), "/org/bluez/42/hci0 " + path,
         "POINTER was created" + onAdapter},
        {adapter, "DeviceRemoved", newDevice,
         set(adapter, &Adapter::setDeviceRemovedHandler, onPath), "/org/bluez/42/hci0 " + path,
         "POINTER was removed" + onAdapter},
        // Without arguments a callback gets the proxy that runs the loop.
        {device,
         "DisconnectRequested",
         {},
         set(device, &Device::setDisconnectRequestedHandler, onSignal),
         "/loop",
         "Disconnect requested from /loop\n"},
        {sink,
         "Connected",
         {},
         set(sink, &AudioSink::setConnectedHandler, onSignal),
         "/loop",
         "Connected from /loop\n"},
        {sink,
         "Disconnected",
         {},
         set(sink, &AudioSink::setDisconnectedHandler, onSignal),
         "/loop",
         "Disconnected from /loop\n"},
        {sink,
         "Playing",
         {},
         set(sink, &AudioSink::setPlayingHandler, onSignal),
         "/loop",
         "Playing in /loop\n"},
        {sink,
         "Stopped",
         {},
         set(sink, &AudioSink::setStoppedHandler, onSignal),
         "/loop",
         "Stopped in /loop\n"},
        {control,
         "Connected",
         {},
         set(control, &Control::setConnectedHandler, onSignal),
         "/loop",
         "Connected from /loop\n"},
        {control,
         "Disconnected",
         {},
         set(control, &Control::setDisconnectedHandler, onSignal),
         "/loop",
         "Disconnected from /loop\n"},
        {control, "PropertyChanged", powered,
         set(control, &Control::setPropertyChangedHandler, onProperty), path + " Powered=1",
         "Powered was changed in " + path + " with 1\n"},
    };
    const ReceiveLoop running(loop);
    for (const auto& given : cases) {
        const std::string what = std::string(given.proxy.getInterface()) + "." + given.member;
        seen().clear();
        // The default one is in front, since it subscribed last: it has printed when ours is told.
        ASSERT_EQ(given.set(true), 0) << what;
        ASSERT_EQ(given.set(false), 0) << what;
        StdoutCapture output;
        daemon.emit(given.proxy.getPath(), given.proxy.getInterface(), given.member,
                    given.arguments);
        ASSERT_TRUE(seen().waitFor(1)) << what;
        const std::regex pointer("0x[0-9a-f]+");
        EXPECT_EQ(std::regex_replace(output.take(), pointer, "POINTER"), given.printed) << what;
        EXPECT_EQ(seen().events(), Texts{given.reported}) << what;
    }
    EXPECT_EQ(log.take(), Texts{});
}

} // namespace Bluetooth::Test
