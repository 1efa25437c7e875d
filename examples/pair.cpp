// SPDX-License-Identifier: LGPL-2.1-or-later
// Pairs with a device. The command line may have the PIN code or passkey; a passkey that both sides
// show is confirmed.
//   pair ADDRESS [PIN]
#include <bluetooth/adapter.h>
#include <bluetooth/agent.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <iostream>
#include <memory>
#include <string>

using namespace Bluetooth;

int fail(const std::string& text, int status = 1) {
    std::cerr << text << '\n';
    return status;
}

int main(int argc, char** argv) {
    if (argc != 2 && argc != 3)
        return fail("usage: pair ADDRESS [PIN]", 2);
    const std::string address = argv[1];
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager)
        return fail("bluetoothd is not running; start it and try again");
    const std::unique_ptr<Adapter> adapter(manager->defaultAdapter());
    if (!adapter)
        return fail("there is no adapter; plug one in and try again");

    Agent agent; // set up first: it serves requests from registerPath() on
    if (argc == 3)
        agent.setPasskeyValue(argv[2]);
    if (agent.registerPath() != 0)
        return fail("cannot serve the agent; see the system log");
    // Takes as long as the other side's user takes. Ctrl-C ends the wait, but not the pairing.
    const std::unique_ptr<Device> device(adapter->createPairedDevice(address.c_str(), agent));
    const int error = adapter->getErrorNumber();
    const std::string text = adapter->getErrorMessage();
    constexpr int interrupted = 2; // "Reply message is null"
    if (error == interrupted)
        adapter->cancelDeviceCreation(address.c_str());
    agent.unregisterPath();
    if (error == interrupted)
        return fail("the pairing was interrupted; try again");
    if (!device)
        return fail("cannot pair with " + address + " (" + text +
                    "); check that it can be paired, and the PIN");

    const std::unique_ptr<Dict> properties(device->getProperties());
    std::cout << "paired with " << address << "  " << find(properties.get(), "Name") << '\n';
    return 0;
}
