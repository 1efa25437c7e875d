// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_FILE_PLACE_H
#define KESBLUETOOTH_HOST_FILE_PLACE_H

#include "core/descriptor.h"

#include <memory>
#include <string>

namespace Bluetooth {

/// Where a file really is: its folder, held open, and its name there. Nobody who renames folders or
/// makes links afterwards can put another folder into its place.
struct FilePlace {
    std::unique_ptr<Descriptor> folder; ///< for the calls that end in "at" only
    std::string name;                   ///< not a link when it was looked at; it may be missing
};

/// Follows a path and the links in it, of root's and of the own user's only: who may lay a link
/// into the way would choose the file.
/// @param mayBeMissing whether the file is to be made; its folder is there in any case
/// @return null with errno set: ELOOP for another user's link and for too many
std::unique_ptr<FilePlace> findPlace(const std::string& path, bool mayBeMissing = false);

} // namespace Bluetooth

#endif
