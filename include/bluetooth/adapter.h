// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_ADAPTER_H
#define KESBLUETOOTH_ADAPTER_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

class Agent;
class Device;
class DeviceList;

/// The proxy of one local Bluetooth controller (interface org.bluez.Adapter).
///
/// The daemon keeps sessions and discoveries for this process's bus connection, whichever Adapter
/// requested them: proxies neither count nor end them.
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAdapter() or a Manager and deleted by the caller; its subscriptions end
/// with it.
class KESBLUETOOTH_API Adapter : public BluezObject {
public:
    /// Prefer getAdapter(), which reports an absent daemon.
    /// @param path see getAdapter()
    explicit Adapter(const char* path);
    ~Adapter() override;

    /// Makes the proxy of an adapter when the daemon is on the bus.
    /// @dbus org.freedesktop.DBus.ListNames() -> as
    /// @param path object path, e.g. "/org/bluez/1234/hci0"; not checked
    /// @return a new Adapter, deleted by the caller; null when the daemon is not on the bus
    static Adapter* getAdapter(const char* path);

    /// Reads all properties, and adds "HCIVersion" at the end: a string such as "2.1", from
    /// /usr/bin/hciconfig. It is "" when that program prints no version, and missing when the
    /// program cannot be started or takes more than 5 s (logged).
    /// @dbus GetProperties() -> a{sv}
    /// @return a new dictionary, deleted by the caller; null when the daemon's part fails
    ///
    /// Blocks until the daemon replies, at most 25 s, and while hciconfig runs, at most 5 s.
    Dict* getProperties() override;

    /// Makes the daemon keep the controller up until releaseSession(). It needs an agent that was
    /// registered by registerAgent(). While the controller is off the daemon first asks that agent
    /// by ConfirmModeChange, which an Agent refuses unless its setDispatcher() was given a function
    /// that replies: switch it on before, by setProperty("Powered", true).
    /// @dbus RequestSession()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int requestSession();
    /// Ends one requestSession().
    /// @dbus ReleaseSession()
    /// @return as requestSession()
    int releaseSession();

    /// Starts a discovery, which reports what it finds by the signal DeviceFound. The daemon
    /// counts: it needs one stop for each start.
    /// @dbus StartDiscovery()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int startDiscovery();
    /// Ends one startDiscovery().
    /// @dbus StopDiscovery()
    /// @return as startDiscovery()
    int stopDiscovery();

    /// Looks up a device that the daemon already knows.
    /// @dbus FindDevice(s address) -> o
    /// @param address  six two-digit hexadecimal groups, e.g. "00:11:22:33:44:55"
    /// @param logError whether a failure is logged; getErrorMessage() returns it either way
    /// @return a new Device, deleted by the caller; null when the daemon does not know the address,
    ///         cannot be reached, or leaves the bus meanwhile
    ///
    /// Blocks until the daemon replies, at most 25 s.
    Device* findDevice(const char* address, bool logError);

    /// Returns one device of the daemon's list.
    /// @dbus ListDevices() -> ao
    /// @param index from 0
    /// @return a new Device, deleted by the caller; null past the end (not logged) or on failure
    ///
    /// Blocks until the daemon replies, at most 25 s.
    Device* getDeviceByIndex(unsigned int index);

    /// Lists all devices that the daemon knows on this adapter.
    /// @dbus ListDevices() -> ao
    /// @return a new list, deleted by the caller, empty when there is no device; null on failure.
    ///         Elements are null when the daemon leaves the bus meanwhile.
    ///
    /// Blocks until the daemon replies, at most 25 s.
    DeviceList* listDevices();

    /// Connects to a device and makes it known to the daemon without pairing.
    /// @dbus CreateDevice(s address) -> o
    /// @param address see findDevice()
    /// @return a new Device, deleted by the caller; null on failure
    ///
    /// Blocks until the daemon replies, at most 25 s: the daemon may still succeed after that.
    Device* createDevice(const char* address);

    /// Pairs with a device and makes it known to the daemon.
    /// @dbus CreatePairedDevice(s address, o agent, s capability) -> o
    /// @param address see findDevice()
    /// @param agent   answers the daemon's requests; its registerPath() must have succeeded
    /// @return a new Device, deleted by the caller; null on failure, with the daemon's error
    ///
    /// Blocks until the daemon replies. The library sets no time-out: a pairing takes as long as
    /// the other side's user takes, and the daemon reports a device that is out of range or does
    /// not answer (usually after 5 to 60 s). SIGINT or SIGTERM ends the wait within half a second
    /// (after the agent's delay, when one is running) with null and error 2, "Reply message is
    /// null"; a handler for both signals is installed and stays. The daemon then still pairs:
    /// cancelDeviceCreation() stops it. The loss of the bus ends the wait too.
    ///
    /// While it waits, this thread answers the agent's requests, so no other may change the agent.
    /// Signals still reach their callbacks on the receive thread, when one runs; otherwise they are
    /// kept until one does. One thread of the process at a time may be here.
    Device* createPairedDevice(const char* address, const Agent& agent);

    /// Ends a createDevice() or createPairedDevice() of this process that is under way: after an
    /// interruption, or from another thread by another Adapter of the same path.
    /// @dbus CancelDeviceCreation(s address)
    /// @param address see findDevice()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int cancelDeviceCreation(const char* address);

    /// Makes the daemon forget a device and its pairing.
    /// @dbus RemoveDevice(o device)
    /// @param devicePath the device's object path, not its address
    /// @return 0 when the call was handed to the bus; -1 with error 3, "Invalid path", for null or
    ///         a string without a leading "/", -1 for any other failure
    int removeDevice(const char* devicePath);

    /// Makes the daemon ask this agent when a device wants to pair with the adapter.
    /// @dbus RegisterAgent(o agent, s capability)
    /// @param agent not owned; its registerPath() must have succeeded, and it must live until its
    ///              unregisterPath()
    /// @return 0 when the call was handed to the bus, otherwise -1
    ///
    /// Requests are answered only by a thread that dispatches the system bus connection, as
    /// createPairedDevice() does while it waits. A request that the receive thread reads while
    /// nobody waits there gets no reply, and the daemon gives up.
    int registerAgent(const Agent& agent);
    /// Ends registerAgent().
    /// @dbus UnregisterAgent(o agent)
    /// @return as registerAgent()
    int unregisterAgent(const Agent& agent);

    /// Subscribes to DeviceFound. It comes again for a device whose signal strength or name
    /// changed.
    /// @dbus signal DeviceFound(s address, a{sv} properties)
    /// @param callback called on the receive thread with this proxy, the device's address and its
    ///                 properties; null selects deviceFoundHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceFoundHandler(StringDictCallback callback);
    /// Subscribes to DeviceDisappeared: a found device is no longer in range.
    /// @dbus signal DeviceDisappeared(s address)
    /// @param callback called as above, with the device's address; null selects
    ///                 deviceDisappearedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceDisappearedHandler(StringCallback callback);
    /// Subscribes to DeviceCreated: the daemon knows a new device.
    /// @dbus signal DeviceCreated(o device)
    /// @param callback called as above, with the device's object path; null selects
    ///                 deviceCreatedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceCreatedHandler(ObjectPathCallback callback);
    /// Subscribes to DeviceRemoved: the daemon has forgotten a device.
    /// @dbus signal DeviceRemoved(o device)
    /// @param callback called as above, with the device's object path; null selects
    ///                 deviceRemovedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceRemovedHandler(ObjectPathCallback callback);

    /// Default callback. Prints "ADDRESS was found by PATH", then the properties, one a line, then
    /// an empty line.
    static void deviceFoundHandler(RemoteObject* sender, const char* address,
                                   const Dict* properties);
    /// Default callback. Prints "ADDRESS was disappeared in PATH".
    static void deviceDisappearedHandler(RemoteObject* sender, const char* address);
    /// Default callback. Prints "POINTER was created by PATH", where POINTER is the argument's
    /// address in memory, not the device's path.
    static void deviceCreatedHandler(RemoteObject* sender, const ObjectPath* device);
    /// Default callback. Prints "POINTER was removed by PATH", with POINTER as above.
    static void deviceRemovedHandler(RemoteObject* sender, const ObjectPath* device);
};

} // namespace Bluetooth

#endif
