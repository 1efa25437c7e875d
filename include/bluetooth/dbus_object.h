// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_DBUS_OBJECT_H
#define KESBLUETOOTH_DBUS_OBJECT_H

#include <bluetooth/remote_object.h>

#include <string>
#include <vector>

namespace Bluetooth {

/// The proxy of the system bus itself (interface org.freedesktop.DBus), for listing its names.
///
/// Threads: one thread at a time may use a DBusObject.
class KESBLUETOOTH_API DBusObject : public RemoteObject {
public:
    DBusObject();
    ~DBusObject() override;

    /// Lists the names that are owned on the system bus, in the bus's order: unique names such as
    /// ":1.42" and well-known names such as "org.bluez".
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @return a new list, deleted by the caller; never null. On failure it is empty, the error is
    ///         logged and stays in the proxy (hasError()).
    ///
    /// Blocks until the bus replies, at most 25 s.
    std::vector<std::string>* listNames();
};

} // namespace Bluetooth

#endif
