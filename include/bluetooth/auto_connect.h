// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_AUTO_CONNECT_H
#define KESBLUETOOTH_AUTO_CONNECT_H

#include <bluetooth/device_list.h>
#include <bluetooth/export.h>

#include <functional>
#include <string>
#include <vector>

namespace Bluetooth {

/// The lists of devices to connect automatically, one for each adapter.
///
/// Each adapter has a file /etc/bluetooth/autoconnect/ADDRESS, named by the adapter's address as
/// the caller writes it (case matters; the daemon reports upper case). It holds a flag and the
/// devices' addresses, without a line end:
/// @code
///     1,AA:BB:CC:DD:EE:FF,11:22:33:44:55:66
/// @endcode
/// "1" is enabled, "0" disabled. Every operation but readList() that reads a missing file creates
/// it, disabled and empty; an empty file counts as that too. A file beyond 1 MiB is not read: it
/// counts as disabled and empty, and only set() changes it.
///
/// A change is done as one step: of a process that ends or a machine that fails meanwhile, the old
/// or the new list is left, whole, and readers find one of these. The file's owner and mode stay;
/// of a symbolic link, the file that it points to is replaced, unless the link is another user's
/// than root's or the caller's. Where the folder takes no new file, the file is written in place,
/// without that promise, if it has no other name.
///
/// The auto-connect daemon reads the same files and takes commands from the pipe
/// /tmp/kes_bluetooth_autoconnect.
///
/// ERRORS. A failure is returned and logged.
/// THREADS. There is no state; any thread may call. Changes by several threads or processes wait
/// for each other (a lock of the file .lock beside the lists); readers wait for nothing. Two calls
/// are not one step: what getDeviceList() returned may be out of date when set() writes it. Use
/// changeList() to add, remove or enable.
class KESBLUETOOTH_API AutoConnect {
public:
    /// What an adapter's file holds.
    struct List {
        bool isEnabled = false;           ///< the flag, as getEnable() returns it
        std::vector<std::string> devices; ///< the addresses, or whatever is between the commas
    };

    /// Whether a file can be used as a list. Creates a missing file, and a missing folder
    /// /etc/bluetooth/autoconnect/.
    /// @param path the file's full path
    /// @return true for a regular file that may be read and written
    bool checkConfigFile(const char* path) const;

    /// Whether an adapter's devices are to be connected.
    /// @param adapter address of the adapter, e.g. "AA:BB:CC:DD:EE:FF"
    /// @return the flag: true when the number at the beginning of the file is not 0; false also
    ///         when it cannot be read
    bool getEnable(const char* adapter) const;

    /// Rewrites the file and calls reload(), whose result does not count.
    /// @param adapter    address of the adapter
    /// @param enable     the flag
    /// @param deviceList written after the flag as it is, so each address needs a comma before it:
    ///                   ",AA:BB:CC:DD:EE:FF". Without the first comma it is written all the same,
    ///                   and readers miss its first character.
    /// @return true when the file was rewritten
    bool set(const char* adapter, bool enable, const char* deviceList);

    /// Reads an adapter's list as it is in its file. Neither creates nor changes the file, and asks
    /// no daemon.
    /// @param adapter address of the adapter
    /// @param list    receives the list; a missing file is disabled and empty
    /// @return true; false with errno set (logged) when there is a file that cannot be read whole:
    ///         EFBIG when it is too large
    bool readList(const char* adapter, List& list) const;

    /// Reads an adapter's list, has it changed and writes it, with no change of another program in
    /// between, and calls reload(), whose result does not count. In contrast to removeDevice() it
    /// changes a disabled list too.
    /// @code
    ///     autoConnect.changeList(adapter, [](AutoConnect::List& list) {
    ///         list.devices.push_back("11:22:33:44:55:66");
    ///     });
    /// @endcode
    /// @param adapter address of the adapter
    /// @param change  called once, in this thread, with the list; not where it cannot be read. It
    ///                may not use AutoConnect, and should not take long: other programs wait for
    ///                it. When it throws, nothing is changed.
    /// @return true when the list was written; false when it cannot be read or written (logged)
    bool changeList(const char* adapter, const std::function<void(List&)>& change);

    /// Removes every entry equal to `device` (case matters), rewrites the file and calls reload().
    /// The list of an adapter whose flag is not "1" is left as it is.
    /// @param adapter address of the adapter
    /// @param device  address of the device, as it is in the file
    /// @return true when the file was processed, whether or not it could be rewritten; false when
    ///         it is beyond 1 MiB or cannot be read to its end, which leaves it as it is
    bool removeDevice(const char* adapter, const char* device);

    /// Returns the devices of one adapter's list, enabled or not. Entries that the adapter does not
    /// know are removed from an enabled file, one after the other (removeDevice()), and named in
    /// the log. Entries for which the daemon did not reply (it hangs or restarts, the adapter was
    /// removed) are kept.
    /// @dbus org.bluez.Manager.FindAdapter(s pattern) -> o, and for each entry
    ///       org.bluez.Adapter.FindDevice(s address) -> o
    /// @param adapter address of the adapter
    /// @return a new list, possibly empty, deleted by the caller; null when the daemon or the
    ///         adapter is not there, or the file cannot be opened
    ///
    /// Blocks for one call of the daemon for each entry.
    DeviceList* getDeviceList(const char* adapter);

    /// Returns the devices to connect: those of the enabled lists of all powered adapters, in the
    /// daemon's order of adapters. Unknown entries are removed as in getDeviceList().
    /// @dbus org.bluez.Manager.ListAdapters() -> ao, org.bluez.Adapter.GetProperties() -> a{sv},
    ///       and for each entry FindDevice(s address) -> o
    /// @return a new list, possibly empty, deleted by the caller; null when the daemon is not there
    ///
    /// Blocks for some calls of the daemon for each adapter, and one for each entry.
    DeviceList* getAutoConnectDeviceList();

    /// Writes a command to the auto-connect daemon's pipe, as it is, without a line end. Never
    /// waits.
    /// @param command e.g. "pause"
    /// @return true when all of it was written; false with errno set otherwise: ENXIO when no
    ///         daemon reads the pipe, EAGAIN when it is full, and as Fifo::getWriteFifo() sets it
    ///         without permission, or when what stands there is not a pipe of root's or one's own
    bool sendCommand(const char* command) const;
    /// Makes the auto-connect daemon read the files again: sends "1". @return as sendCommand()
    bool reload() const;
    /// Makes it connect nothing until resume(): sends "pause". @return as sendCommand()
    bool pause() const;
    /// Ends pause(): sends "resume". @return as sendCommand()
    bool resume() const;
};

} // namespace Bluetooth

#endif
