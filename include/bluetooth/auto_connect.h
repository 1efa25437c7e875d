#ifndef KESBLUETOOTH_AUTO_CONNECT_H
#define KESBLUETOOTH_AUTO_CONNECT_H

#include <bluetooth/device_list.h>
#include <bluetooth/export.h>

namespace Bluetooth {

/// Which devices are to be connected automatically, adapter by adapter.
///
/// Each adapter has a file /etc/bluetooth/autoconnect/ADDRESS, named by the adapter's address as
/// the caller writes it (case matters; the daemon reports upper case). It holds a flag and the
/// devices' addresses, without line breaks:
/// @code
///     1,AA:BB:CC:DD:EE:FF,11:22:33:44:55:66
/// @endcode
/// "1" is enabled, "0" disabled. A missing file is created disabled and empty by every operation
/// that looks at it. A file beyond 1 MiB is not read: it counts as disabled and empty, and only
/// set() changes it.
///
/// The auto-connect daemon reads the same files and takes commands from the pipe
/// /tmp/kes_bluetooth_autoconnect.
///
/// ERRORS. Failures are told by the result and a log line.
/// THREADS. There is no state; any thread may call. Nothing is locked: two processes that change
/// one file at the same moment may lose one of the changes.
class KESBLUETOOTH_API AutoConnect {
public:
    /// Whether a file can be used as a configuration file; creates it when it is missing (and the
    /// folder /etc/bluetooth/autoconnect/ with it).
    /// @param path the file's full path
    /// @return true for a regular file that may be read and written
    bool checkConfigFile(const char* path) const;

    /// Tells whether an adapter's devices are to be connected.
    /// @param adapter address of the adapter, e.g. "AA:BB:CC:DD:EE:FF"
    /// @return the flag: true when the number at the beginning of the file is not 0; false also
    ///         when it cannot be read
    bool getEnable(const char* adapter) const;

    /// Rewrites the file and tells the daemon (reload(); that there may be none is no failure).
    /// @param adapter    address of the adapter
    /// @param enable     the flag
    /// @param deviceList written after the flag as it stands, so each address needs a comma before
    ///                   it: ",AA:BB:CC:DD:EE:FF". Without the first comma the text is written
    ///                   all the same, and readers miss its first character.
    /// @return true when the file was rewritten
    bool set(const char* adapter, bool enable, const char* deviceList);

    /// Drops every entry equal to `device` (case matters), rewrites the file and tells the daemon.
    /// The list of an adapter whose flag is not "1" is left as it is.
    /// @param adapter address of the adapter
    /// @param device  address of the device, as it is in the file
    /// @return true when the file was processed, whether or not it could be rewritten; false when
    ///         it is beyond 1 MiB or cannot be read to its end, which leaves it as it is
    bool removeDevice(const char* adapter, const char* device);

    /// The devices of one adapter's list, enabled or not. Entries that the adapter does not know
    /// are removed from an enabled file, one after the other (removeDevice()). Entries that the
    /// daemon gave no answer about (it hangs or restarts, the adapter was pulled out) are kept.
    /// @param adapter address of the adapter
    /// @return a new list, possibly empty, deleted by the caller; null when the daemon or the
    ///         adapter is not there, or the file cannot be opened
    ///
    /// Blocks for one call of the daemon for each entry.
    DeviceList* getDeviceList(const char* adapter);

    /// The devices that are to be connected: the lists of all adapters that are powered and
    /// enabled, in the daemon's order of adapters. Unknown entries are removed as in
    /// getDeviceList().
    /// @return a new list, possibly empty, deleted by the caller; null when the daemon is not there
    ///
    /// Blocks for some calls of the daemon for each adapter, and one for each entry.
    DeviceList* getAutoConnectDeviceList();

    /// Writes a command to the daemon's pipe, as it stands and without a line end. Never waits.
    /// @param command e.g. "pause"
    /// @return true when all of it was written; false also when no daemon reads the pipe
    bool sendCommand(const char* command) const;
    /// Tells the daemon to read the files again ("1").
    bool reload() const;
    /// Tells the daemon to connect nothing until resume() ("pause").
    bool pause() const;
    /// Ends pause() ("resume").
    bool resume() const;
};

} // namespace Bluetooth

#endif
