// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIGNAL_HANDLER_H
#define KESBLUETOOTH_SIGNAL_HANDLER_H

#include <bluetooth/object_path.h>
#include <bluetooth/variant.h>

#include <string>
#include <utility>

/// @file
/// The callbacks of signals.

namespace Bluetooth {

class RemoteObject;

/// Called when a signal without arguments arrives.
///
/// Callbacks of all kinds run on the receive thread (RemoteObject::startLoop) of their bus, one at
/// a time, in the order in which the signals arrived. No lock of the library is held meanwhile: a
/// callback may call methods, subscribe and destroy proxies. While it runs no other signal is
/// delivered; those that arrive are kept in memory until it returns. Its arguments are valid only
/// during the call.
/// @param receiver the proxy that runs the loop; for the other kinds the one that subscribed
using NoArgumentCallback = void (*)(RemoteObject* receiver);
/// For signals with a string (D-Bus type s). Otherwise see NoArgumentCallback.
using StringCallback = void (*)(RemoteObject* receiver, const char* text);
/// For signals with an object path (o). Otherwise see NoArgumentCallback.
using ObjectPathCallback = void (*)(RemoteObject* receiver, const ObjectPath* path);
/// For signals with a name and a value (sv). Otherwise see NoArgumentCallback.
using StringVariantCallback = void (*)(RemoteObject* receiver, const char* name,
                                       const Variant* value);
/// For signals with a string and properties (sa{sv}). Otherwise see NoArgumentCallback.
using StringDictCallback = void (*)(RemoteObject* receiver, const char* text, const Dict* dict);

/// One subscription: the proxy that made it, the signal's name and the callback.
template <class Callback>
class SignalHandler {
public:
    /// Holds the three.
    /// @param subscriber the proxy, not owned
    /// @param signalName the signal's name
    /// @param function   the callback
    SignalHandler(RemoteObject* subscriber, std::string signalName, Callback function)
        : object(subscriber), member(std::move(signalName)), callback(function) {}
    virtual ~SignalHandler() = default;

    RemoteObject* object; ///< not owned
    std::string member;   ///< the signal's name
    Callback callback;    ///< the callback
};

} // namespace Bluetooth

#endif
