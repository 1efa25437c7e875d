// SPDX-License-Identifier: LGPL-2.1-or-later
// Shows the devices in range as they come and go, for a time or until Ctrl-C.
//   find_devices [SECONDS]     10 by default
#include <bluetooth/adapter.h>
#include <bluetooth/connection.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <csignal>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <string>
#include <unistd.h>

using namespace Bluetooth;

Manager* receiver = nullptr; // runs the receive thread, which a signal ends

int fail(const std::string& text, int status = 1) {
    std::cerr << text << '\n';
    return status;
}

// Both are called on the receive thread.
void found(RemoteObject*, const char* address, const Dict* properties) {
    std::cout << "found " << address << "  " << find(properties, "RSSI") << " dBm  "
              << find(properties, "Name") << std::endl;
}
void disappeared(RemoteObject*, const char* address) {
    std::cout << "gone  " << address << std::endl;
}

int main(int argc, char** argv) {
    const long seconds = argc > 1 ? std::strtol(argv[1], nullptr, 10) : 10;
    if (argc > 2 || seconds <= 0)
        return fail("usage: find_devices [SECONDS]", 2);
    Connection::checkSenders(true); // no signals but the daemon's own
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager)
        return fail("bluetoothd is not running; start it and try again");
    const std::unique_ptr<Adapter> adapter(manager->defaultAdapter());
    if (!adapter)
        return fail("there is no adapter; plug one in and try again");
    if (adapter->setDeviceFoundHandler(found) != 0 ||
        adapter->setDeviceDisappearedHandler(disappeared) != 0)
        return fail("cannot watch the adapter; see the system log");
    // In steps: startDiscovery() would not wait for the daemon's reply.
    if (adapter->newMessage("StartDiscovery") != 0 || adapter->sendMessage(true, -1) != 0)
        return fail("cannot search: " + adapter->getErrorMessage() + "; switch the adapter on");

    receiver = manager.get();
    struct sigaction stop = {};
    stop.sa_handler = [](int) { receiver->stopLoop(); };
    for (const int number : {SIGINT, SIGTERM, SIGALRM})
        sigaction(number, &stop, nullptr);
    alarm(static_cast<unsigned>(seconds));
    if (manager->startLoop() != 0)
        return fail("cannot start the receive thread; end other programs and try again");
    manager->waitLoop(); // until one of the signals comes
    return adapter->stopDiscovery() == 0 ? 0 : fail("the system bus has gone");
}
