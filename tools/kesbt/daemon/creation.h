// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_CREATION_H
#define KESBT_DAEMON_CREATION_H

#include "wait/watchdog.h"

#include <bluetooth/adapter.h>

#include <string>

namespace Kesbt {

/// A task whose cancellation stops the creation of a device on the adapter.
inline Watchdog::Task creationTask(const Bluetooth::Adapter& adapter, const std::string& address,
                                   const std::string& name) {
    Watchdog::Task task;
    task.name = name + " " + address;
    // A proxy of its own: the other one is waiting meanwhile.
    task.cancel = [path = std::string(adapter.getPath()), address] {
        Bluetooth::Adapter(path.c_str()).cancelDeviceCreation(address.c_str());
    };
    return task;
}

} // namespace Kesbt

#endif
