#ifndef KESBLUETOOTH_MANAGER_H
#define KESBLUETOOTH_MANAGER_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

class Adapter;
class AdapterList;

/// The proxy of the daemon's root object (path "/", interface org.bluez.Manager), from which a
/// program starts:
/// @code
///     std::unique_ptr<Manager> manager(Manager::getManager());
///     if (!manager)
///         return fail("bluetoothd is not running");
///     std::unique_ptr<Adapter> adapter(manager->defaultAdapter());
/// @endcode
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getManager() and deleted by the caller. Adapters that it returned do not
/// depend on it.
class KESBLUETOOTH_API Manager : public BluezObject {
public:
    /// Prefer getManager(), which tells when the daemon is absent.
    Manager();
    ~Manager() override;

    /// Makes the proxy when the daemon is there (ListNames of the bus).
    /// @return a new Manager, deleted by the caller; null when the daemon is not on the bus
    static Manager* getManager();

    /// Gives the adapter that the daemon prefers (DefaultAdapter).
    /// @return a new Adapter, deleted by the caller; null when there is none, the daemon cannot be
    ///         reached, or leaves the bus meanwhile
    ///
    /// Blocks until the daemon answers, at most 25 s. So do the three operations that follow.
    Adapter* defaultAdapter();

    /// Looks an adapter up (FindAdapter).
    /// @param pattern the adapter's name, e.g. "hci0", or its address
    /// @return as defaultAdapter()
    Adapter* findAdapter(const char* pattern);

    /// Gives the adapter at a place in the daemon's list (ListAdapters).
    /// @param index from 0. One past the end gives the default adapter instead of null, at the cost
    ///              of a second call; when that fails too, the error is logged twice.
    /// @return as defaultAdapter()
    Adapter* getAdapterByIndex(unsigned int index);

    /// Lists all adapters (ListAdapters). Unlike the other operations this one logs nothing, and
    /// the error of an earlier call stays in the proxy.
    /// @return a new list, deleted by the caller, empty when there is no adapter; null on failure.
    ///         Elements are null when the daemon leaves the bus meanwhile.
    AdapterList* listAdapters();

    /// Subscribes to AdapterAdded: an adapter was plugged in.
    /// @param callback called on the receive thread with this proxy and the adapter's path; null
    ///                 selects the default callback, here adapterAddedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setAdapterAddedHandler(ObjectPathCallback callback);
    /// Subscribes to AdapterRemoved: an adapter was pulled out. Otherwise as
    /// setAdapterAddedHandler().
    int setAdapterRemovedHandler(ObjectPathCallback callback);
    /// Subscribes to DefaultAdapterChanged: the daemon prefers another adapter now. Otherwise as
    /// setAdapterAddedHandler().
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
