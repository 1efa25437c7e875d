// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_PID_FILE_H
#define KESBLUETOOTH_HOST_PID_FILE_H

namespace Bluetooth {

/// What failed when a PID file was made.
enum class PidFileFailure { Open, GetFlags, SetFlags, LockedByOther, Lock, Truncate, Write };

/// Opens, locks and writes a PID file as createPidFile() describes, but logs nothing.
/// @return the open descriptor; -1 with errno and `failure` set
int lockPidFile(const char* path, int flags, PidFileFailure& failure);

} // namespace Bluetooth

#endif
