// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_FILE_REPLACEMENT_H
#define KESBLUETOOTH_HOST_FILE_REPLACEMENT_H

#include <string>

namespace Bluetooth {

enum class Replacement { Done, NotOpened, NotWritten };

/// Gives a file another content, so that who reads it, also after a crash, finds the old one or the
/// new one, whole. The file's owner and mode stay; of a symbolic link, the file that it points to
/// is replaced. Where its folder takes no new file, the file is written in place.
/// @param isAlone whether no other process replaces the file now; what processes that were killed
///                have left in its folder is then removed
Replacement replaceFile(const std::string& path, const std::string& content, bool isAlone);

} // namespace Bluetooth

#endif
