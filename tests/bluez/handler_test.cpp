// Signals of the daemon: the callbacks that a program sets, and what the default ones print.

#include "support/callbacks.h"
#include "support/peer_test.h"
#include "support/stdout_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/manager.h>

#include <functional>
#include <regex>

namespace Bluetooth::Test {

namespace {

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
         set(manager, &Manager::setAdapterAddedHandler, onPath), "path / /new",
         "/new was added by /\n"},
        {manager, "AdapterRemoved", newAdapter,
         set(manager, &Manager::setAdapterRemovedHandler, onPath), "path / /new",
         "/new was removed by /\n"},
        {manager, "DefaultAdapterChanged", newAdapter,
         set(manager, &Manager::setDefaultAdapterChangedHandler, onPath), "path / /new",
         "Default adpater is /new in / now\n"},
        {adapter, "PropertyChanged", powered,
         set(adapter, &Adapter::setPropertyChangedHandler, onVariant),
         "variant /org/bluez/42/hci0 Powered=1",
         "Powered was changed in /org/bluez/42/hci0 with 1\n"},
        {adapter, "DeviceFound", foundDevice, set(adapter, &Adapter::setDeviceFoundHandler, onDict),
         "dict /org/bluez/42/hci0 00:11:22:33:44:55 Name: Phone;RSSI: -60;",
         "00:11:22:33:44:55 was found" + onAdapter + "Name: Phone\nRSSI: -60\n\n"},
        {adapter, "DeviceDisappeared", [](Writer& w) { w(address); },
         set(adapter, &Adapter::setDeviceDisappearedHandler, onString),
         "string /org/bluez/42/hci0 00:11:22:33:44:55",
         "00:11:22:33:44:55 was disappeared in /org/bluez/42/hci0\n"},
        {adapter, "DeviceCreated", newDevice,
         set(adapter, &Adapter::setDeviceCreatedHandler, onPath), "path /org/bluez/42/hci0 " + path,
         "POINTER was created" + onAdapter},
        {adapter, "DeviceRemoved", newDevice,
         set(adapter, &Adapter::setDeviceRemovedHandler, onPath), "path /org/bluez/42/hci0 " + path,
         "POINTER was removed" + onAdapter},
        // Without arguments a callback gets the proxy that runs the loop.
        {device,
         "DisconnectRequested",
         {},
         set(device, &Device::setDisconnectRequestedHandler, onNothing),
         "nothing /loop",
         "Disconnect requested from /loop\n"},
        {sink,
         "Connected",
         {},
         set(sink, &AudioSink::setConnectedHandler, onNothing),
         "nothing /loop",
         "Connected from /loop\n"},
        {sink,
         "Disconnected",
         {},
         set(sink, &AudioSink::setDisconnectedHandler, onNothing),
         "nothing /loop",
         "Disconnected from /loop\n"},
        {sink,
         "Playing",
         {},
         set(sink, &AudioSink::setPlayingHandler, onNothing),
         "nothing /loop",
         "Playing in /loop\n"},
        {sink,
         "Stopped",
         {},
         set(sink, &AudioSink::setStoppedHandler, onNothing),
         "nothing /loop",
         "Stopped in /loop\n"},
        {control,
         "Connected",
         {},
         set(control, &Control::setConnectedHandler, onNothing),
         "nothing /loop",
         "Connected from /loop\n"},
        {control,
         "Disconnected",
         {},
         set(control, &Control::setDisconnectedHandler, onNothing),
         "nothing /loop",
         "Disconnected from /loop\n"},
        {control, "PropertyChanged", powered,
         set(control, &Control::setPropertyChangedHandler, onVariant),
         "variant " + path + " Powered=1", "Powered was changed in " + path + " with 1\n"},
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
