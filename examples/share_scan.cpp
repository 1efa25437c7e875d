// SPDX-License-Identifier: LGPL-2.1-or-later
// Shows the devices that the shared scan finds. Any number of programs may run at once: the adapter
// runs one discovery for all of them.
//   share_scan [SECONDS]     10 by default
#include <bluetooth/bluez_object.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/scanner.h>

#include <cstdlib>
#include <iostream>
#include <memory>
#include <set>
#include <string>
#include <unistd.h>

using namespace Bluetooth;

int fail(const std::string& text, int status = 1) {
    std::cerr << text << '\n';
    return status;
}

int main(int argc, char** argv) {
    const long seconds = argc > 1 ? std::strtol(argv[1], nullptr, 10) : 10;
    if (argc > 2 || seconds <= 0)
        return fail("usage: share_scan [SECONDS]", 2);
    if (!BluezObject::hasBluetoothd())
        return fail("bluetoothd is not running; start it and try again");

    Scanner scanner;
    std::set<std::string> shown;
    for (long second = 0; second < seconds; ++second) {
        // The first call starts the service and its discovery: normally it returns no device yet.
        const std::unique_ptr<std::vector<std::pair<std::string, Dict*>>> devices(
            scanner.listDevices("hci0", false));
        if (!devices)
            return fail("cannot scan (" + scanner.getErrorMessage() +
                        "); check that hci0 is there and kesbt-scannerd is installed");
        for (const auto& [address, dict] : *devices) {
            const std::unique_ptr<Dict> properties(dict); // ours to delete, as the list is
            if (shown.insert(address).second)
                std::cout << address << "  " << find(properties.get(), "RSSI") << " dBm  "
                          << find(properties.get(), "Name") << std::endl;
        }
        sleep(1);
    }
    return 0; // removeFinder() would end discovery for all programs; the service ends by itself
}
