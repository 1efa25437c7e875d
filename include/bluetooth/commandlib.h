// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_COMMANDLIB_H
#define KESBLUETOOTH_COMMANDLIB_H

#include <bluetooth/export.h>

/// @file
/// What daemons and management tools need besides proxies. Any thread may call the functions.

namespace Bluetooth {

/// How long getNameFromAddr() waits for the remote device. The value is the time-out in
/// milliseconds: any other number of milliseconds may be cast to the type; 0 waits without limit.
enum GetNameTimeout : int {
    /// 2 s: a device nearby that answers at the usual interval (1.28 s).
    GET_NAME_TIMEOUT_SHORT = 2000,
    /// 10 s: the longest that a controller pages by default (5.12 s), and time for the name.
    GET_NAME_TIMEOUT_DEFAULT = 10000,
    /// 25 s: a device that answers rarely, or a controller that is busy discovering.
    GET_NAME_TIMEOUT_LONG = 25000,
};

/// Writes a PID file that is also the lock of a daemon's only instance.
///
/// The file is created with mode 0600, locked, emptied, and given this process's id and a newline.
/// The lock lasts as long as the descriptor, normally as long as the process; the file stays.
/// It is a record lock: it belongs to the process (a second call of the same process succeeds),
/// is not inherited by fork(), and ends when the process closes any descriptor of the file.
/// @param path         the file; its folder must exist. A symbolic link and a file
///                     that has another name (EMLINK) are refused: another program's file would be
///                     emptied.
/// @param flags        bit 0 (value 1) makes the descriptor close-on-exec; others are ignored
/// @param reportLocked whether to log that another process holds the lock
/// @return the open descriptor; -1 on failure (logged) with errno set, EAGAIN or EACCES when
///         another process holds the lock
KESBLUETOOTH_API int createPidFile(const char* path, int flags, bool reportLocked);

/// Kills a running bluetoothd (SIGKILL) and starts /usr/sbin/bluetoothd, which must put itself into
/// the background. Does nothing without an adapter, that is without a marker file
/// /tmp/bluetooth.info_*. Needs root.
///
/// A process is the running daemon when its executable's path contains "bluetoothd" anywhere: a
/// program with a longer name, or in a folder of such a name, counts too.
/// @return 0 when bluetoothd runs afterwards; -1 otherwise (logged)
///
/// Blocks for 1 s when a daemon was killed, and until the started program returns.
KESBLUETOOTH_API int restartBluetoothd();

/// Returns the address in a device's object path: what follows the first "dev_", with ":" for each
/// "_". "/org/bluez/1234/hci0/dev_00_11_22_33_44_55" gives "00:11:22:33:44:55"; further components
/// are kept.
/// @param path may be null
/// @return a new string, released by the caller with free(); null when there is no "dev_"
KESBLUETOOTH_API char* getAddressFromPath(const char* path);

/// Asks a remote device for its name, over HCI, without the daemon. Needs permission to use HCI
/// sockets (CAP_NET_RAW), and the device in range.
/// @param address the device, e.g. "00:11:22:33:44:55"
/// @param name    receives the name, cut to fit and always terminated; untouched on failure
/// @param size    size of `name` in bytes
/// @param timeout how long to wait, in milliseconds
/// @return 0; -1 when an argument is invalid, no adapter is on, or the device does not answer
///         (nothing is logged)
///
/// Blocks until the device answers or the time is over.
KESBLUETOOTH_API int getNameFromAddr(const char* address, char* name, int size,
                                     GetNameTimeout timeout);

} // namespace Bluetooth

#endif
