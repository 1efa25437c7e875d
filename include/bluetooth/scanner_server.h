// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_SERVER_H
#define KESBLUETOOTH_SCANNER_SERVER_H

#include <bluetooth/scanner_object.h>
#include <bluetooth/server_object.h>

#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace Bluetooth {

class Finders;
class Manager;
class ScannerState;
struct StartedDiscovery;

/// The scanner service: lets several programs share the discovery of Bluetooth devices. It serves
/// com.kestrine.bluetooth.Scanner (see scanner_object.h for its methods, Scanner for the client)
/// on the session bus under the name com.kestrine.bluetooth, at the path "/".
/// @code
///     ScannerServer server;
///     server.startLoop();    // ends by itself
///     server.stopDiscovery();
/// @endcode
/// kesbt-scannerd is this program with what a daemon needs around it.
///
/// LIFE. The loop ends 30 s after the last finder was made, even while clients keep calling for
/// adapters that have one. Only reaching exactly 0 ends it: a startLoop() after that, without a new
/// finder, counts on below 0 and does not end by itself.
///
/// DAEMON. Without the Bluetooth daemon the service runs all the same: ListDevices replies that the
/// adapter is not found, and each call looks for the daemon again. After a restart of the daemon
/// its adapters have other object paths, and so other finders; those of the old paths stay, without
/// effect, until the service ends.
///
/// MEMORY. The properties of the 4,096 devices that were heard of last are kept until the service
/// ends, at most 4 KiB a device and commonly 0.5 KiB. When there are more, the device that was not
/// heard of for longest is forgotten and listed no more; the first time is logged.
///
/// TWO ADAPTERS. The signals of one adapter reach the finders of all: a device that one adapter
/// found is returned for the others too.
///
/// THREADS. The ScannerServer made last is the current one: handlers and callbacks use it. Handlers
/// and timer run on the thread in startLoop(), the callbacks for found devices on the receive
/// thread. Any thread may call the operations below, except the constructor, the destructor and
/// stopDiscovery().
class KESBLUETOOTH_API ScannerServer : public ServerObject {
public:
    /// Serves the object and becomes the current server. When a part of that fails, or the
    /// Bluetooth daemon is absent, this is logged and the rest works.
    /// @dbus org.freedesktop.DBus.RequestName(s name, u flags) -> u on the session bus; those of
    ///       updateFilterSet()
    ///
    /// Blocks until the bus and the daemon have replied.
    ScannerServer();
    /// Leaves the discoveries running: stopDiscovery() ends them, or the end of the process's bus
    /// connection.
    ~ScannerServer() override;

    /// Counts down to the end of the loop. @return 0 when it ends, otherwise 1
    int callbackThreadHandler(void* data) override;

    /// Makes a finder for an adapter before a client calls for it (ScannerObject::addFinder).
    /// @param adapterId the adapter's name or address; nothing happens when the daemon does not
    ///                  know it
    void addAdapterFounder(const char* adapterId);

    /// Reads which devices the daemon knows: they are left out of all replies. Each ListDevices
    /// does this. Without the daemon none is left out; that it never was there is logged.
    /// @dbus org.bluez.Manager.ListAdapters() -> ao, org.bluez.Adapter.ListDevices() -> ao
    void updateFilterSet();
    /// Whether a device is left out of replies.
    /// @return whether the daemon knew the device when updateFilterSet() was called last
    bool isInFilterSet(const std::string& address);

    /// Keeps the formatted properties of a found device as they are, in place of earlier ones.
    void putInfoToMap(const std::string& address, const std::string& text);
    /// Returns the formatted properties of a found device.
    /// @return the string kept; "" for an unknown address, for which an empty entry is kept from
    ///         then on
    std::string getInfoFromMap(const std::string& address);

    /// Ends all discoveries that finders started, and the receiving for them: for the end of the
    /// program. Stops the receive threads of the process (see RemoteObject::stopLoop()).
    /// @dbus org.bluez.Adapter.StopDiscovery()
    void stopDiscovery();

private:
    friend class ServerObject; // startLoop() begins and ends the receiving
    friend class Finders;      // asks for the manager, as the server itself does

    Manager* fetchManager();
    void startReceiver();
    void startReceiving();
    void stopReceiving();
    void joinReceiver();
    std::vector<StartedDiscovery> takeDiscoveries();

    ScannerObject* m_scannerObject;
    std::unique_ptr<ScannerState> m_state; // what the threads share; it locks for itself
    std::unique_ptr<Finders> m_finders;

    // Guards what follows. Nothing is called while it is held: no bus, no GLib, no callback. No
    // other lock is taken under it.
    std::mutex m_receiverMutex;
    std::unique_ptr<Manager> m_manager; // set once
    bool m_receives = false;            // startLoop() runs
    bool m_hasReceiver = false;         // the manager has a receive thread that nobody joined
};

} // namespace Bluetooth

#endif
