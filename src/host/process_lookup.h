// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_PROCESS_LOOKUP_H
#define KESBLUETOOTH_HOST_PROCESS_LOOKUP_H

namespace Bluetooth {

/// Finds a running process by its executable.
/// @param name text that the executable's path contains anywhere
/// @return the first match in the order of process ids as text (1000 before 200); -1 for none.
///         Processes whose executable may not be seen are passed over.
int getPidFromName(const char* name);

} // namespace Bluetooth

#endif
