// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/dbus_object.h>

#include "core/method_call.h"

#include <memory>

namespace Bluetooth {

DBusObject::DBusObject()
    : RemoteObject(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, DBUS_BUS_SYSTEM) {}

DBusObject::~DBusObject() = default;

std::vector<std::string>* DBusObject::listNames() {
    auto names = std::make_unique<std::vector<std::string>>();
    readMethod(KES_HERE, *this, "ListNames", *names);
    return names.release();
}

} // namespace Bluetooth
