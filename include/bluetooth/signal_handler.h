#ifndef KESBLUETOOTH_SIGNAL_HANDLER_H
#define KESBLUETOOTH_SIGNAL_HANDLER_H

#include <bluetooth/object_path.h>
#include <bluetooth/variant.h>

#include <string>
#include <utility>

namespace Bluetooth {

class RemoteObject;

/// What a program gives to be called when a signal arrives.
///
/// Callbacks run on the receive thread (RemoteObject::startLoop) of their bus, one at a time, in
/// the order in which the signals arrived. No lock of the library is held meanwhile: a callback may
/// call methods, subscribe and destroy proxies. While it runs no other signal is delivered; signals
/// that come in are kept in memory until it returns. What the pointers point at is valid only
/// during the call.
using NoArgumentCallback = void (*)(RemoteObject* receiver);
using StringCallback = void (*)(RemoteObject* receiver, const char* text);
using ObjectPathCallback = void (*)(RemoteObject* receiver, const ObjectPath* path);
using StringVariantCallback = void (*)(RemoteObject* receiver, const char* name,
                                       const Variant* value);
using StringDictCallback = void (*)(RemoteObject* receiver, const char* text, const Dict* dict);

/// One subscription: the proxy that made it, the signal's name and the callback.
template <class Callback>
class SignalHandler {
public:
    SignalHandler(RemoteObject* subscriber, std::string signalName, Callback function)
        : object(subscriber), member(std::move(signalName)), callback(function) {}
    virtual ~SignalHandler() = default;

    RemoteObject* object; ///< not owned; null once the proxy was destroyed
    std::string member;
    Callback callback;
};

} // namespace Bluetooth

#endif
