// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SCANNER_OBJECT_H
#define KESBLUETOOTH_SCANNER_OBJECT_H

#include <bluetooth/export.h>

#include <glib-object.h>
#include <glib.h>

#include <map>
#include <memory>
#include <set>
#include <string>

/// @file
/// The served object of the scanner service, and the handlers of its methods.

namespace Bluetooth {

/// Addresses of devices ("00:11:22:33:44:55"), ordered byte by byte.
using AddressSet = std::set<std::string>;

/// The GObject that the scanner service exports: it holds the finders. Made with
/// g_object_new(scanner_object_get_type(), nullptr); ScannerServer owns one.
///
/// A finder is the set of the devices in range of one adapter, while discovery runs there.
///
/// Threads: the operations may be called from any thread. The map and the sets themselves are
/// guarded by the current ScannerServer and change while its loop runs: read them only when it
/// does not.
struct KESBLUETOOTH_API ScannerObject {
    GObject parent; ///< GObject's own part
    /// Adapter object path -> addresses found on that adapter and not disappeared.
    std::map<std::string, std::shared_ptr<AddressSet>> finders;

    /// Starts discovery on an adapter, with a finder for the devices that appear, and keeps the
    /// service running for 30 s from now.
    /// @dbus org.bluez.Manager.FindAdapter(s pattern) -> o, org.bluez.Adapter.StartDiscovery(),
    ///       signals DeviceFound(s, a{sv}) and DeviceDisappeared(s)
    /// @param adapterId the adapter's object path, which is also the finder's key. The daemon looks
    ///                  up its last component, e.g. "hci0", since it does not look up paths; any
    ///                  other string is passed to it as it is.
    /// @return the new, empty set; null when there is no current server or no such adapter.
    ///         When the adapter has a finder already, that one is kept, and the returned set stays
    ///         empty though discovery was started once more.
    ///
    /// The caller does not own the set; scanner_object_remove_finder() for the adapter deletes it.
    /// Blocks until the daemon has replied.
    AddressSet* addFinder(const char* adapterId);

    /// Returns the finder of an adapter, made by addFinder() when there is none.
    /// @param path the adapter's object path
    /// @return the set as addFinder() describes it, or null
    AddressSet* getListByName(std::string path);
};

/// The GObject type of ScannerObject, registered by the first call.
KESBLUETOOTH_API GType scanner_object_get_type();

/// Serves ListDevices: returns the devices in range that the Bluetooth daemon does not know yet.
/// The first call for an adapter starts discovery.
/// @dbus served: com.kestrine.bluetooth.Scanner.ListDevices(s adapter) -> a{ss}
/// @param object    the exported object; null is an error
/// @param adapterId the adapter's name or address
/// @param devices   receives a new table, freed with its strings by g_hash_table_unref(): address
///                  -> properties as dictConquerToString() formats them with ";", each ";" that a
///                  device has in its texts replaced by ",", each control character by a blank;
///                  entries beyond 4 KiB are left out. Without a device it holds the one pair
///                  "" -> "".
/// @param error     receives "Object %s not found", "Server %s not found", "Adapter %s not found"
///                  or "Set %s not found", with the adapterId, of which the first 255 bytes are
///                  told. Longer ones are no adapter, nor is "any".
/// @return FALSE with `error` set on failure
///
/// Blocks until the daemon has replied.
KESBLUETOOTH_API gboolean scanner_object_list_devices(ScannerObject* object, const char* adapterId,
                                                      GHashTable** devices, GError** error);

/// Serves RemoveFinder: ends discovery on the adapter and deletes its finder. An adapter without a
/// finder is a success.
/// @dbus served: com.kestrine.bluetooth.Scanner.RemoveFinder(s adapter); calls
///       org.bluez.Adapter.StopDiscovery()
/// @param object    the exported object; null is an error
/// @param adapterId the adapter's name or address; null is an error
/// @param error     receives "Scanner or AdapterId is null". On purpose it is not set for an
///                  adapter that the daemon does not know: the client then gets an error message
///                  of dbus-glib's.
/// @return FALSE on failure
///
/// Blocks until the daemon has replied.
KESBLUETOOTH_API gboolean scanner_object_remove_finder(ScannerObject* object, const char* adapterId,
                                                       GError** error);

} // namespace Bluetooth

#endif
