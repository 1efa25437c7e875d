#ifndef KESBLUETOOTH_ADAPTER_H
#define KESBLUETOOTH_ADAPTER_H

#include <bluetooth/bluez_object.h>

namespace Bluetooth {

class Agent;
class Device;
class DeviceList;

/// The proxy of one local Bluetooth controller (interface org.bluez.Adapter).
///
/// A session and a discovery are kept by the daemon for this process's bus connection, whichever
/// Adapter asked for them: proxies neither count nor end them.
///
/// Properties, threads, errors and what blocks: see BluezObject.
/// Lifetime: created by getAdapter() or a Manager and deleted by the caller; its subscriptions end
/// with it.
class KESBLUETOOTH_API Adapter : public BluezObject {
public:
    /// Prefer getAdapter(), which tells when the daemon is absent.
    explicit Adapter(const char* path);
    ~Adapter() override;

    /// Makes the proxy of an adapter when the daemon is there (ListNames of the bus).
    /// @param path e.g. "/org/bluez/1234/hci0"; not checked
    /// @return a new Adapter, deleted by the caller; null when the daemon is not on the bus
    static Adapter* getAdapter(const char* path);

    /// Reads all properties (GetProperties) and adds "HCIVersion" at the end, a text such as "2.1"
    /// that /usr/bin/hciconfig tells. The text is empty when that program prints no version, and
    /// the entry is missing when it cannot be started (logged).
    /// @return a new dictionary, deleted by the caller; null when the daemon's part fails
    ///
    /// Blocks until the daemon answers, at most 25 s, and while hciconfig runs.
    Dict* getProperties() override;

    /// Asks the daemon to keep the controller up (RequestSession) until releaseSession().
    /// @return 0 when the call was handed to the bus, otherwise -1
    int requestSession();
    /// Gives back one requestSession() (ReleaseSession). @return as requestSession()
    int releaseSession();

    /// Starts looking for devices (StartDiscovery). The daemon counts: it needs one stop for each
    /// start. What is found is told by the signal DeviceFound.
    /// @return 0 when the call was handed to the bus, otherwise -1
    int startDiscovery();
    /// Takes back one startDiscovery() (StopDiscovery). @return as startDiscovery()
    int stopDiscovery();

    /// Looks up a device that the daemon already knows (FindDevice).
    /// @param address  text form, six two-digit hexadecimal groups, e.g. "00:11:22:33:44:55"
    /// @param logError whether a failure is written to the log; getErrorMessage() tells it either
    ///                 way
    /// @return a new Device, deleted by the caller; null when the daemon does not know the address,
    ///         cannot be reached, or leaves the bus meanwhile
    ///
    /// Blocks until the daemon answers, at most 25 s.
    Device* findDevice(const char* address, bool logError);

    /// Gives the device at a place in the daemon's list (ListDevices).
    /// @param index from 0
    /// @return a new Device, deleted by the caller; null past the end (not logged) or on failure
    ///
    /// Blocks until the daemon answers, at most 25 s.
    Device* getDeviceByIndex(unsigned int index);

    /// Lists all devices that the daemon knows on this adapter (ListDevices).
    /// @return a new list, deleted by the caller, empty when there is no device; null on failure.
    ///         Elements are null when the daemon leaves the bus meanwhile.
    ///
    /// Blocks until the daemon answers, at most 25 s.
    DeviceList* listDevices();

    /// Connects to a device and makes it known to the daemon without pairing (CreateDevice).
    /// @param address see findDevice()
    /// @return a new Device, deleted by the caller; null on failure
    ///
    /// Blocks until the daemon answers, at most 25 s: the daemon may still succeed after that.
    Device* createDevice(const char* address);

    /// Pairs with a device and makes it known to the daemon (CreatePairedDevice).
    /// @param address see findDevice()
    /// @param agent   answers the daemon's questions; its registerPath() must have succeeded
    /// @return a new Device, deleted by the caller; null on failure, the daemon's text as the error
    ///
    /// Blocks until the daemon answers. No time-out of the library ends it: a pairing takes as long
    /// as the other side's user takes, and the daemon reports a device that is out of reach or does
    /// not answer (usually after 5 to 60 s). SIGINT or SIGTERM ends the wait within half a second
    /// (after the agent's delay, when one is running) with null and error 2, "Reply message is
    /// null"; a handler for both signals is installed and stays. The daemon then still pairs:
    /// cancelDeviceCreation() stops it. A bus that goes away ends the wait too.
    ///
    /// While it waits, the agent's requests are answered on this thread, so the agent must not be
    /// changed by another one. Signals still reach their callbacks on the receive thread, when one
    /// runs; otherwise they are kept until one does. One thread of the process at a time may be
    /// here.
    Device* createPairedDevice(const char* address, const Agent& agent);

    /// Ends a createDevice() or createPairedDevice() of this process that is under way
    /// (CancelDeviceCreation), from another thread or after an interruption.
    /// @param address see findDevice()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int cancelDeviceCreation(const char* address);

    /// Makes the daemon forget a device and its pairing (RemoveDevice).
    /// @param devicePath the device's object path, not its address
    /// @return 0 when the call was handed to the bus; -1 with error 3, "Invalid path", for null or
    ///         a text without a leading "/", -1 for any other failure
    int removeDevice(const char* devicePath);

    /// Makes an agent the one that the daemon asks when a device wants to pair with this adapter
    /// (RegisterAgent). Its registerPath() must have succeeded.
    ///
    /// Requests are answered only by a thread that dispatches the system bus connection, as
    /// createPairedDevice() does while it waits. One that the receive thread reads while nobody
    /// waits there stays unanswered, and the daemon gives up.
    /// @param agent not owned; has to live until its unregisterPath()
    /// @return 0 when the call was handed to the bus, otherwise -1
    int registerAgent(const Agent& agent);
    /// Takes that back (UnregisterAgent). @return as registerAgent()
    int unregisterAgent(const Agent& agent);

    /// Subscribes to DeviceFound. It comes again for a device whose signal strength or name
    /// changed.
    /// @param callback called on the receive thread with this proxy, the device's address and its
    ///                 properties; null selects deviceFoundHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceFoundHandler(StringDictCallback callback);
    /// Subscribes to DeviceDisappeared: a found device is no longer in reach.
    /// @param callback gets the device's address; null selects deviceDisappearedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceDisappearedHandler(StringCallback callback);
    /// Subscribes to DeviceCreated: the daemon knows a new device.
    /// @param callback gets the device's path; null selects deviceCreatedHandler()
    /// @return 0, or -1 when the bus refuses (logged)
    int setDeviceCreatedHandler(ObjectPathCallback callback);
    /// Subscribes to DeviceRemoved: the daemon has forgotten a device.
    /// @param callback gets the device's path; null selects deviceRemovedHandler()
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
