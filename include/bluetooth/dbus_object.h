#ifndef KESBLUETOOTH_DBUS_OBJECT_H
#define KESBLUETOOTH_DBUS_OBJECT_H

#include <bluetooth/remote_object.h>

#include <string>
#include <vector>

namespace Bluetooth {

/// The proxy of the system bus itself (org.freedesktop.DBus), for listing who is there.
///
/// Threads: one thread at a time may use a DBusObject.
class KESBLUETOOTH_API DBusObject : public RemoteObject {
public:
    DBusObject();
    ~DBusObject() override;

    /// Lists the names that are owned on the system bus (ListNames), in the bus's order: unique
    /// names such as ":1.42" and well-known ones such as "org.bluez".
    /// @return a new list, deleted by the caller; never null. On failure it is empty, the error is
    ///         logged and stays in the proxy (hasError()).
    ///
    /// Blocks until the bus answers, at most 25 s.
    std::vector<std::string>* listNames();
};

} // namespace Bluetooth

#endif
