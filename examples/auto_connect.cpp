// SPDX-License-Identifier: LGPL-2.1-or-later
// Puts a device on the default adapter's auto-connect list: kesbt-autoconnectd then connects it
// whenever it is in range. Needs permission to write below /etc/bluetooth.
//   auto_connect ADDRESS
#include <bluetooth/adapter.h>
#include <bluetooth/auto_connect.h>
#include <bluetooth/device.h>
#include <bluetooth/dict_codec.h>
#include <bluetooth/manager.h>

#include <algorithm>
#include <iostream>
#include <memory>
#include <string>

using namespace Bluetooth;

int fail(const std::string& text, int status = 1) {
    std::cerr << text << '\n';
    return status;
}

std::string addressOf(BluezObject& object) {
    const std::unique_ptr<Dict> properties(object.getProperties());
    return find(properties.get(), "Address");
}

int main(int argc, char** argv) {
    if (argc != 2)
        return fail("usage: auto_connect ADDRESS", 2);
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager)
        return fail("bluetoothd is not running; start it and try again");
    const std::unique_ptr<Adapter> adapter(manager->defaultAdapter());
    if (!adapter)
        return fail("there is no adapter; plug one in and try again");
    const std::unique_ptr<Device> device(adapter->findDevice(argv[1], false));
    if (!device)
        return fail(std::string(argv[1]) + " is not known to the adapter; pair with it first");

    const std::string adapterAddress = addressOf(*adapter);
    const std::string address = addressOf(*device);
    std::string list;
    const auto putLast = [&](AutoConnect::List& changed) {
        changed.isEnabled = true;
        auto& devices = changed.devices;
        devices.erase(std::remove(devices.begin(), devices.end(), address), devices.end());
        devices.push_back(address);
        for (const std::string& listed : devices)
            list += (list.empty() ? "" : ",") + listed;
    };
    if (!AutoConnect().changeList(adapterAddress.c_str(), putLast))
        return fail("cannot change the auto-connect list; run this as root");
    std::cout << "to be connected: " << list << '\n';
    return 0;
}
