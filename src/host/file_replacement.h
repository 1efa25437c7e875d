// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_FILE_REPLACEMENT_H
#define KESBLUETOOTH_HOST_FILE_REPLACEMENT_H

#include <string>

namespace Bluetooth {

enum class Replacement { Done, NotOpened, NotWritten };

/// Gives a file another content, so that who reads it, also after a crash, finds the old one or the
/// new one, whole. The file's owner and mode stay; of a symbolic link, the file that it points to
/// is replaced; another user's link on the way is refused. Where its folder takes no new file, the
/// file is written in place.
/// @param isAlone whether the caller holds the lock of the lists; what processes that were killed
///                have left in the file's folder more than 10 s ago is then removed
Replacement replaceFile(const std::string& path, const std::string& content, bool isAlone);

} // namespace Bluetooth

#endif
