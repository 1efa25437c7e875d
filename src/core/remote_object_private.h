// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_REMOTE_OBJECT_PRIVATE_H
#define KESBLUETOOTH_CORE_REMOTE_OBJECT_PRIVATE_H

#include <bluetooth/remote_object.h>

/// @file
/// What the sources of RemoteObject share.

namespace Bluetooth {

/// Programs know these by their numbers; getErrorMessage() gives each as a string.
enum RemoteObject::ErrorNumber : int {
    errorNullParameter = 1,
    errorNullReply,
    errorInvalidPath,
    errorReplyValue,
    errorReplyFormat,
    errorCreateMessage,
    errorAppendArgs,
    errorAppendIterator,
    errorOpenContainer,
    errorSend,
    errorDBus
};

/// What parseDictionary() found.
enum class RemoteObject::DictResult { Read, NoDict, BadName, BadValue };

} // namespace Bluetooth

#endif
