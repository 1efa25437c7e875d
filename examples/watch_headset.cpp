// SPDX-License-Identifier: LGPL-2.1-or-later
// Connects a headset and shows the changes of its audio until Ctrl-C, which disconnects it.
//   watch_headset ADDRESS
#include <bluetooth/adapter.h>
#include <bluetooth/audio.h>
#include <bluetooth/audio_sink.h>
#include <bluetooth/connection.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <csignal>
#include <iostream>
#include <memory>
#include <string>

using namespace Bluetooth;

Manager* receiver = nullptr; // runs the receive thread, which a signal ends

int fail(const std::string& text, int status = 1) {
    std::cerr << text << '\n';
    return status;
}

// Called on the receive thread, with the proxy that subscribed.
void changed(RemoteObject* from, const char* name, const Variant* value) {
    std::cout << from->getInterface() << ' ' << name << '=' << variantToString(*value) << std::endl;
}

int main(int argc, char** argv) {
    if (argc != 2)
        return fail("usage: watch_headset ADDRESS", 2);
    Connection::checkSenders(true); // no signals but the daemon's own
    const std::unique_ptr<Manager> manager(Manager::getManager());
    const std::unique_ptr<Adapter> adapter(manager ? manager->defaultAdapter() : nullptr);
    if (!adapter)
        return fail("there is no bluetoothd or no adapter; start it or plug one in");
    std::unique_ptr<Device> device(adapter->findDevice(argv[1], false));
    if (!device)
        device.reset(adapter->createDevice(argv[1]));
    if (!device)
        return fail("cannot reach the headset (" + adapter->getErrorMessage() + "); switch it on");

    receiver = manager.get();
    struct sigaction stop = {};
    stop.sa_handler = [](int) { receiver->stopLoop(); };
    sigaction(SIGINT, &stop, nullptr);

    Audio audio(device->getPath());
    AudioSink sink(device->getPath());
    if (audio.setPropertyChangedHandler(changed) != 0 ||
        sink.setPropertyChangedHandler(changed) != 0 || manager->startLoop() != 0)
        return fail("cannot watch the headset; see the system log");
    // In steps: connect() would not wait for the daemon's reply. Changes are shown meanwhile.
    const bool connected = (audio.newMessage("Connect") == 0 && audio.sendMessage(true, -1) == 0) ||
                           std::string("org.bluez.Error.AlreadyConnected") == audio.getErrorName();
    if (!connected)
        manager->stopLoop();
    manager->waitLoop(); // until Ctrl-C
    if (!connected)
        return fail("cannot connect (" + audio.getErrorMessage() + "); switch the headset on");
    return audio.disconnect() == 0 ? 0 : fail("cannot disconnect: the system bus has gone");
}
