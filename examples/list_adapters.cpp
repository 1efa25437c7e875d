// SPDX-License-Identifier: LGPL-2.1-or-later
// Lists the Bluetooth adapters of this host.
#include <bluetooth/adapter.h>
#include <bluetooth/adapter_list.h>
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

int main() {
    const std::unique_ptr<Manager> manager(Manager::getManager());
    if (!manager)
        return fail("bluetoothd is not running; start it and try again");
    const std::unique_ptr<AdapterList> adapters(manager->listAdapters());
    if (!adapters)
        return fail("cannot list the adapters: " + manager->getErrorMessage());
    if (adapters->empty())
        return fail("there is no adapter; plug one in and try again");
    for (Adapter* adapter : *adapters) {
        // The adapter is null when bluetoothd left while the list was made, the properties when it
        // left later.
        const std::unique_ptr<Dict> properties(adapter ? adapter->getProperties() : nullptr);
        if (!properties)
            return fail("bluetoothd has gone; start it and try again");
        const bool powered = find(properties.get(), "Powered") == "1";
        std::cout << find(properties.get(), "Address") << (powered ? "  on   " : "  off  ")
                  << find(properties.get(), "Name") << '\n';
    }
    return 0;
}
