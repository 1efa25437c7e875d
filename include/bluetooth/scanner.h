// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_H
#define KESBLUETOOTH_SCANNER_H

#include <bluetooth/remote_object.h>

#include <string>
#include <utility>
#include <vector>

namespace Bluetooth {

/// The client of the scanner service (bus name com.kestrine.bluetooth on the session bus, see
/// ScannerServer), with which several programs share one discovery:
/// @code
///     Scanner scanner;
///     while (watching) {
///         auto* devices = scanner.listDevices("hci0", true);
///         ...
///         sleep(1);
///     }
///     scanner.removeFinder("hci0");
/// @endcode
///
/// The first call for an adapter starts discovery there, and the service itself where the session
/// bus can activate it; later calls return the devices found. The service ends about 30 s after it
/// last began a discovery, and its discoveries with it; the next call starts it anew.
///
/// Errors: see RemoteObject; each operation first resets the error.
/// Threads: one thread at a time may use a Scanner.
class KESBLUETOOTH_API Scanner : public RemoteObject {
public:
    Scanner();
    ~Scanner() override;

    /// Returns the devices in range of an adapter that the Bluetooth daemon does not know yet.
    /// @dbus com.kestrine.bluetooth.Scanner.ListDevices(s adapter) -> a{ss}; before it
    ///       org.bluez.Manager.FindAdapter(s pattern) -> o
    /// @param adapterId the adapter's name, e.g. "hci0", or its address
    /// @param logErrors whether a failure of the service is logged; getErrorMessage() returns it
    ///                  either way. An error of the Bluetooth daemon is always logged, its
    ///                  absence never.
    /// @return a new list of (address, properties), deleted by the caller together with each Dict
    ///         in it; empty when no device was found yet. Null on failure; the service is not
    ///         called when the Bluetooth daemon is absent (getErrorName() is then
    ///         org.freedesktop.DBus.Error.NameHasNoOwner) or does not know the adapter
    ///         (org.bluez.Error.NoSuchAdapter).
    ///
    /// A Dict holds the properties that the daemon reported for the device (Address, Class, Icon,
    /// RSSI, Name, ...), in its order, every value as a string: RSSI is "-60", Paired "0".
    ///
    /// Blocks until the service replies, at most 25 s each for the daemon and the service.
    std::vector<std::pair<std::string, Dict*>>* listDevices(const char* adapterId, bool logErrors);

    /// Ends the service's discovery on an adapter, for all its clients: the next listDevices() of
    /// any of them starts it again.
    /// @dbus com.kestrine.bluetooth.Scanner.RemoveFinder(s adapter); before it
    ///       org.bluez.Manager.FindAdapter(s pattern) -> o
    /// @param adapterId see listDevices()
    /// @return whether the call was handed to the bus; its reply is not awaited. False also when
    ///         the Bluetooth daemon is absent or does not know the adapter. A failure is logged,
    ///         but not that the daemon is absent.
    bool removeFinder(const char* adapterId);

private:
    KESBLUETOOTH_LOCAL bool isAdapter(const char* adapterId);
};

} // namespace Bluetooth

#endif
