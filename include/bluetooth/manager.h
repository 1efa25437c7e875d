// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_MANAGER_H
#define KESBLUETOOTH_MANAGER_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

class Adapter;
class AdapterList;

/// The proxy of the daemon's root object (object path "/", interface org.bluez.Manager), with
/// which a program starts:
/// @code
///     std::unique_ptr<Manager> manager(Manager::getManager());
///     if (!manager)
///         return fail("bluetoothd is not running");
///     std::unique_ptr<Adapter> adapter(manager->defaultAdapter());
/// @endcode
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getManager() and deleted by the caller. The adapters that it returned do
/// not depend on it.
class KESBLUETOOTH_API Manager : public BluezObject {
public:
    /// Prefer getManager(), which reports an absent daemon.
    Manager();
    ~Manager() override;

    /// Makes the proxy when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @return a new Manager, deleted by the caller; null when the daemon is not on the bus
    static Manager* getManager();

    /// Returns the daemon's default adapter.
    /// @dbus DefaultAdapter() -> o
    /// @return a new Adapter, deleted by the caller; null when there is none, the daemon cannot be
    ///         reached, or leaves the bus meanwhile
    ///
    /// Blocks until the daemon replies, at most 25 s. So do the three operations that follow.
    Adapter* defaultAdapter();

    /// Looks up an adapter.
    /// @dbus FindAdapter(s pattern) -> o
    /// @param pattern the adapter's name, e.g. "hci0", or its address; not its object path
    /// @return as defaultAdapter()
    Adapter* findAdapter(const char* pattern);

    /// Returns one adapter of the daemon's list.
    /// @dbus ListAdapters() -> ao; past its end DefaultAdapter() -> o
    /// @param index from 0. Past the end it means the default adapter, at the cost of a second
    ///              call; when that fails too, the error is logged twice.
    /// @return as defaultAdapter()
    Adapter* getAdapterByIndex(unsigned int index);

    /// Lists all adapters. Unlike the other operations this one logs nothing, and the error of an
    /// earlier call stays in the proxy.
    /// @dbus ListAdapters() -> ao
    /// @return a new list, deleted by the caller, empty when there is no adapter; null on failure.
    ///         Elements are null when the daemon leaves the bus meanwhile.
    AdapterList* listAdapters();

    /// Subscribes to AdapterAdded: an adapter was plugged in.
    /// @dbus signal AdapterAdded(o adapter)
    /// @param callback called on the receive thread with this proxy and the adapter's object path;
    ///                 null selects the default callback, here adapterAddedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setAdapterAddedHandler(ObjectPathCallback callback);
    /// Subscribes to AdapterRemoved: an adapter was removed. Otherwise as
    /// setAdapterAddedHandler().
    /// @dbus signal AdapterRemoved(o adapter)
    int setAdapterRemovedHandler(ObjectPathCallback callback);
    /// Subscribes to DefaultAdapterChanged: another adapter is the default now. Otherwise as
    /// setAdapterAddedHandler().
    /// @dbus signal DefaultAdapterChanged(o adapter)
    int setDefaultAdapterChangedHandler(ObjectPathCallback callback);

    /// Default callback. Prints "ADAPTER was added by /".
    static void adapterAddedHandler(RemoteObject* sender, const ObjectPath* adapter);
    /// Default callback. Prints "ADAPTER was removed by /".
    static void adapterRemovedHandler(RemoteObject* sender, const ObjectPath* adapter);
    /// Default callback. Prints "Default adpater is ADAPTER in / now" (sic).
    static void defaultAdapterChangedHandler(RemoteObject* sender, const ObjectPath* adapter);
};

} // namespace Bluetooth

#endif
