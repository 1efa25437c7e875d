// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BUS_INTERFACE_H
#define KESBLUETOOTH_SERVING_BUS_INTERFACE_H

#include "serving/bus/call.h"

#include <string>
#include <vector>

namespace Bluetooth::Serving {

struct Argument {
    const char* name;
    const char* type;
};

using Arguments = std::vector<Argument>;

/// Runs one method on the object that serves it.
using Handler = void (*)(void* object, const CallPtr& call);

struct MethodEntry {
    const char* name;
    Arguments in;
    Arguments out;
    Handler handler;
    bool deprecated = false;

    std::string inSignature() const;
};

struct SignalEntry {
    const char* name;
    Arguments arguments;
    bool deprecated = false;
};

/// One interface as a table: dispatch, argument checks and introspection all come from it.
struct Interface {
    const char* name;
    std::vector<MethodEntry> methods;
    std::vector<SignalEntry> signals;

    /// The method of that name and exactly that signature, or null.
    const MethodEntry* find(const std::string& member, const std::string& signature) const;
    /// The `<interface>` element of the introspection data.
    std::string introspection() const;
};

template <auto Function>
struct HandlerOf;
template <class T, void (T::*Function)(const CallPtr&)>
struct HandlerOf<Function> {
    static void run(void* object, const CallPtr& call) {
        (static_cast<T*>(object)->*Function)(call);
    }
};

/// A table entry's handler: `handle<&Adapter::startDiscovery>`.
template <auto Function>
constexpr Handler handle = &HandlerOf<Function>::run;

} // namespace Bluetooth::Serving

#endif
