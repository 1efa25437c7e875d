// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_NETWORK_H
#define KESBLUETOOTH_NETWORK_H

#include <bluetooth/bluez_object.h>

#include <string>

namespace Bluetooth {

/// The proxy of one remote device's network access (interface org.bluez.Network).
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getNetwork() and deleted by the caller.
class KESBLUETOOTH_API Network : public BluezObject {
public:
    /// Prefer getNetwork(), which reports an absent daemon.
    /// @param path see getNetwork()
    explicit Network(const char* path);
    ~Network() override;

    /// Makes the proxy of a device's network when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0/dev_00_11_22_33_44_55"; not checked
    /// @return a new Network, deleted by the caller; null when the daemon is not on the bus
    static Network* getNetwork(const char* path);

    /// Connects to a network of the device. The connection lasts until disconnect(), or until this
    /// process leaves the bus.
    /// @dbus Connect(s uuid) -> s
    /// @param uuid      which network: "nap", "panu" or "gn" in any case, or a UUID
    /// @param interface receives the name of the network interface, e.g. "bnep0"; unchanged on
    ///                  failure
    /// @return 0, or -1 on any failure
    ///
    /// Blocks until the daemon replies, at most 25 s; the daemon may still succeed after that, and
    /// disconnect() ends the attempt. BlueZ 4.100 and 4.101 cannot connect: against their document
    /// they have no Connect with an argument (this fails at once with
    /// org.freedesktop.DBus.Error.UnknownMethod), and never reply to the one without.
    int connect(const char* uuid, std::string& interface);
    /// Makes the daemon disconnect, or end a connect() that is under way in another thread.
    /// @dbus Disconnect()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int disconnect();
};

} // namespace Bluetooth

#endif
