// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_CORE_METHOD_CALL_H
#define KESBLUETOOTH_CORE_METHOD_CALL_H

#include <bluetooth/remote_object.h>

#include "core/log.h"

#include <memory>

/// @file
/// How every wrapper calls its method: forget the last error, begin the call, append the arguments,
/// send, read the reply, log what went wrong. A wrapper names the method and its arguments; the log
/// line names the wrapper's file.

namespace Bluetooth {

/// Writes the proxy's error, if it has one, to the log. The error stays in the proxy.
inline void logAnyError(LogPlace place, RemoteObject& object) {
    if (object.hasError())
        logError(place, "%s", object.getErrorMessage().c_str());
}

/// Begins the call and appends the arguments; stops at the first that fails.
template <class... Args>
bool beginCall(RemoteObject& object, const char* method, const Args&... args) {
    return object.newMessage(method) >= 0 && (... && (object.append(args) >= 0));
}

/// Calls and reads the reply's value, without forgetting or logging errors.
template <class Reply, class... Args>
bool askFor(RemoteObject& object, const char* method, Reply& reply, const Args&... args) {
    return beginCall(object, method, args...) && object.sendMessage(true, -1) >= 0 &&
           object.getReplyValue(reply) >= 0;
}

/// Calls a method whose reply has a value. @return whether `reply` was read
template <class Reply, class... Args>
bool readMethod(LogPlace place, RemoteObject& object, const char* method, Reply& reply,
                const Args&... args) {
    object.resetError();
    const bool read = askFor(object, method, reply, args...);
    logAnyError(place, object);
    return read;
}

/// Calls a method that only succeeds or fails, without waiting for it. @return 0 or -1
template <class... Args>
int callMethod(LogPlace place, RemoteObject& object, const char* method, const Args&... args) {
    object.resetError();
    const bool sent = beginCall(object, method, args...) && object.sendMessage(false, -1) >= 0;
    logAnyError(place, object);
    return sent ? 0 : -1;
}

/// Calls a method that replies with a dictionary. @return a new one, or null
template <class... Args>
Dict* readDict(LogPlace place, RemoteObject& object, const char* method, const Args&... args) {
    auto dict = std::make_unique<Dict>();
    return readMethod(place, object, method, *dict, args...) ? dict.release() : nullptr;
}

} // namespace Bluetooth

#endif
