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
/// A finder is what remembers the devices in reach of one adapter while discovery runs there.
///
/// Threads: the operations may be called from any thread. The map and the sets themselves are
/// guarded by the current ScannerServer and change while its loop runs: read them only when it
/// does not.
struct KESBLUETOOTH_API ScannerObject {
    GObject parent; ///< what GObject keeps
    /// Adapter object path -> addresses found on that adapter and not disappeared.
    std::map<std::string, std::shared_ptr<AddressSet>> finders;

    /// Starts discovery on an adapter and remembers what is found there, and lets the service live
    /// on for 30 s.
    /// @param adapterId the adapter's object path, which is also the finder's key. The daemon is
    ///                  asked for its last component, e.g. "hci0", since it does not know paths;
    ///                  any other text is passed to it as it is.
    /// @return the new, empty set; null when there is no current server or no such adapter.
    ///         When the adapter has a finder already, that one is kept, and the returned set stays
    ///         empty though discovery was started once more.
    ///
    /// The set is not the caller's; it is gone after scanner_object_remove_finder() for the
    /// adapter. Blocks until the daemon has answered.
    AddressSet* addFinder(const char* adapterId);

    /// Gives the finder of an adapter, made by addFinder() when there is none.
    /// @param path the adapter's object path
    /// @return the set as addFinder() describes it, or null
    AddressSet* getListByName(std::string path);
};

/// The GObject type of ScannerObject, registered when first asked for.
KESBLUETOOTH_API GType scanner_object_get_type();

/// The handler of the D-Bus method ListDevices(s adapter) -> a{ss}: the devices in reach that the
/// Bluetooth daemon does not know yet. The first call for an adapter starts discovery.
/// @param object    the exported object; null is an error
/// @param adapterId the adapter's name or address
/// @param devices   receives a new table, freed with its texts by g_hash_table_unref(): address ->
///                  properties as dictConquerToString() writes them with ";". With nothing to
///                  tell it holds the one pair "" -> "".
/// @param error     receives "Object %s not found", "Server %s not found", "Adapter %s not found"
///                  or "Set %s not found", with the adapterId
/// @return FALSE with `error` set on failure
///
/// Blocks until the daemon has answered.
KESBLUETOOTH_API gboolean scanner_object_list_devices(ScannerObject* object, const char* adapterId,
                                                      GHashTable** devices, GError** error);

/// The handler of the D-Bus method RemoveFinder(s adapter): ends discovery on the adapter and
/// forgets what was found there. An adapter without finder is a success.
/// @param object    the exported object; null is an error
/// @param adapterId the adapter's name or address; null is an error
/// @param error receives "Scanner or AdapterId is null". On purpose it is not set for an adapter
///              that the daemon does not know: the bus then tells a text of its own.
/// @return FALSE on failure
///
/// Blocks until the daemon has answered.
KESBLUETOOTH_API gboolean scanner_object_remove_finder(ScannerObject* object, const char* adapterId,
                                                       GError** error);

} // namespace Bluetooth

#endif
