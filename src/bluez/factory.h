// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_FACTORY_H
#define KESBLUETOOTH_BLUEZ_FACTORY_H

#include <bluetooth/bluez_object.h>

#include <memory>
#include <vector>

namespace Bluetooth {

/// @return a new proxy, or null when the daemon is not on the bus
template <class Proxy, class... Args>
Proxy* makeProxy(Args... args) {
    return BluezObject::hasBluetoothd() ? new Proxy(args...) : nullptr;
}

/// @return a new list with what `get` returns for each path, nulls included
template <class List, class Proxy>
List* makeList(const std::vector<ObjectPath>& paths, Proxy* (*get)(const char*)) {
    auto list = std::make_unique<List>();
    list->reserve(paths.size());
    for (const ObjectPath& path : paths)
        list->push_back(get(path));
    return list.release();
}

} // namespace Bluetooth

#endif
