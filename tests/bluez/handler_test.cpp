// Signals of the daemon: the callbacks that a program sets, and what the default ones print.

#include "bluez/daemon_test.h"
#include "support/receive_loop.h"
#include "support/stdout_capture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/control.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <functional>
#include <memory>

namespace Bluetooth::Test {

namespace {

Recorder<std::string>& seen() {
    static Recorder<std::string> recorder;
    return recorder;
}

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

/// `line` with "0x" and the digits after it replaced by "POINTER".
std::string withoutPointer(const std::string& line) {
    const std::size_t digits = line.find_first_not_of("0123456789abcdef", 2);
    return line.rfind("0x", 0) == 0 && digits > 2 && digits != std::string::npos
               ? "POINTER" + line.substr(digits)
               : line;
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
    const struct {
        RemoteObject& proxy;
        const char* member;
        Writer::Build arguments;
        std::function<int(bool)> set; ///< with a callback or with null, for the default one
        std::string reported;
        Texts printed;
    } cases[] = {
        {manager,
         "AdapterAdded",
         newAdapter,
         [&](bool own) { return manager.setAdapterAddedHandler(own ? onPath : nullptr); },
         "/ /new",
         {"/new was added by /"}},
        {manager,
         "AdapterRemoved",
         newAdapter,
         [&](bool own) { return manager.setAdapterRemovedHandler(own ? onPath : nullptr); },
         "/ /new",
         {"/new was removed by /"}},
        {manager,
         "DefaultAdapterChanged",
         newAdapter,
         [&](bool own) { return manager.setDefaultAdapterChangedHandler(own ? onPath : nullptr); },
         "/ /new",
         {"Default adpater is /new in / now"}},
        {adapter,
         "PropertyChanged",
         powered,
         [&](bool own) { return adapter.setPropertyChangedHandler(own ? onProperty : nullptr); },
         "/org/bluez/42/hci0 Powered=1",
         {"Powered was changed in /org/bluez/42/hci0 with 1"}},
        {adapter,
         "DeviceFound",
         foundDevice,
         [&](bool own) { return adapter.setDeviceFoundHandler(own ? onDevice : nullptr); },
         "/org/bluez/42/hci0 00:11:22:33:44:55 Name: Phone;RSSI: -60;",
         {"00:11:22:33:44:55 was found by /org/bluez/42/hci0", "Name: Phone", "RSSI: -60", ""}},
        {adapter,
         "DeviceDisappeared",
         [](Writer& w) { w(address); },
         [&](bool own) { return adapter.setDeviceDisappearedHandler(own ? onText : nullptr); },
         "/org/bluez/42/hci0 00:11:22:33:44:55",
         {"00:11:22:33:44:55 was disappeared in /org/bluez/42/hci0"}},
        {adapter,
         "DeviceCreated",
         newDevice,
         [&](bool own) { return adapter.setDeviceCreatedHandler(own ? onPath : nullptr); },
         std::string("/org/bluez/42/hci0 ") + devicePath,
         {"POINTER was created by /org/bluez/42/hci0"}},
        {adapter,
         "DeviceRemoved",
         newDevice,
         [&](bool own) { return adapter.setDeviceRemovedHandler(own ? onPath : nullptr); },
         std::string("/org/bluez/42/hci0 ") + devicePath,
         {"POINTER was removed by /org/bluez/42/hci0"}},
        // Without arguments a callback gets the proxy that runs the loop.
        {device,
         "DisconnectRequested",
         {},
         [&](bool own) { return device.setDisconnectRequestedHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Disconnect requested from /loop"}},
        {sink,
         "Connected",
         {},
         [&](bool own) { return sink.setConnectedHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Connected from /loop"}},
        {sink,
         "Disconnected",
         {},
         [&](bool own) { return sink.setDisconnectedHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Disconnected from /loop"}},
        {sink,
         "Playing",
         {},
         [&](bool own) { return sink.setPlayingHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Playing in /loop"}},
        {sink,
         "Stopped",
         {},
         [&](bool own) { return sink.setStoppedHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Stopped in /loop"}},
        {control,
         "Connected",
         {},
         [&](bool own) { return control.setConnectedHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Connected from /loop"}},
        {control,
         "Disconnected",
         {},
         [&](bool own) { return control.setDisconnectedHandler(own ? onSignal : nullptr); },
         "/loop",
         {"Disconnected from /loop"}},
        {control,
         "PropertyChanged",
         powered,
         [&](bool own) { return control.setPropertyChangedHandler(own ? onProperty : nullptr); },
         std::string(devicePath) + " Powered=1",
         {std::string("Powered was changed in ") + devicePath + " with 1"}},
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
        Texts printed;
        for (std::size_t i = 0; i < given.printed.size(); ++i)
            printed.push_back(withoutPointer(output.readLine()));
        EXPECT_EQ(printed, given.printed) << what;
        EXPECT_EQ(output.take(), "") << what;
        EXPECT_EQ(seen().events(), Texts{given.reported}) << what;
    }
    EXPECT_EQ(log.take(), Texts{});
}

} // namespace Bluetooth::Test
