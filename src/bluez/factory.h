// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BLUEZ_FACTORY_H
#define KESBLUETOOTH_BLUEZ_FACTORY_H

#include <bluetooth/bluez_object.h>

#include "core/bus_names.h"

#include <algorithm>
#include <cstddef>
#include <memory>
#include <vector>

namespace Bluetooth {

inline constexpr const char* daemonName = "org.bluez";

/// @return a new proxy, or null when the daemon is not on the bus
template <class Proxy, class... Args>
Proxy* makeProxy(Args... args) {
    return BluezObject::hasBluetoothd() ? new Proxy(args...) : nullptr;
}

/// @return a new list with a proxy for each path, or null where the daemon was not on the bus when
///         the bus was asked for it
template <class Proxy, class List>
List* makeList(const std::vector<ObjectPath>& paths) {
    constexpr std::size_t most = 64; // questions at a time: what a socket takes in one go
    auto list = std::make_unique<List>();
    list->reserve(paths.size());
    while (list->size() < paths.size())
        for (const bool present :
             askWhetherOwned(daemonName, std::min(most, paths.size() - list->size())))
            list->push_back(present ? new Proxy(paths[list->size()].c_str()) : nullptr);
    return list.release();
}

} // namespace Bluetooth

#endif
