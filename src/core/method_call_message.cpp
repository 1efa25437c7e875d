// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/method_call_message.h"

#include <new>

namespace Bluetooth {

namespace {

/// What a thread called last. Threads mostly make one call again and again, and copying a message
/// takes a seventh of the time that libdbus needs to write and check its header anew.
struct LastCall {
    ~LastCall() { ended = true; }
    void become(const std::string& newDestination, const std::string& newPath,
                const std::string& newInterface, const char* newMethod) {
        message.reset();
        method.clear(); // matches nothing until all is in place
        try {
            destination = newDestination;
            path = newPath;
            interface = newInterface;
            method = newMethod;
        } catch (const std::bad_alloc&) { // the method stays empty; the call needs none of this
        }
    }

    std::string destination;
    std::string path;
    std::string interface;
    std::string method;
    MessagePtr message; ///< never sent or appended to; made when the call comes a second time

    static thread_local bool ended; ///< destructors of static objects may still call methods
};

thread_local bool LastCall::ended = false;
thread_local LastCall lastCall;

} // namespace

MessagePtr newMethodCall(const std::string& destination, const std::string& path,
                         const std::string& interface, const char* method) {
    const bool again = !LastCall::ended && lastCall.method == method && lastCall.path == path &&
                       lastCall.interface == interface && lastCall.destination == destination;
    if (again && lastCall.message)
        return MessagePtr(dbus_message_copy(lastCall.message.get()));
    if (!dbus_validate_member(method, nullptr))
        return nullptr;
    MessagePtr message(
        dbus_message_new_method_call(destination.c_str(), path.c_str(), interface.c_str(), method));
    if (again && message)
        lastCall.message.reset(dbus_message_copy(message.get()));
    else if (!LastCall::ended)
        lastCall.become(destination, path, interface, method);
    return message;
}

} // namespace Bluetooth
