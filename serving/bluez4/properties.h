// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_PROPERTIES_H
#define KESBLUETOOTH_SERVING_BLUEZ4_PROPERTIES_H

#include "serving/bus/call.h"

#include <initializer_list>

namespace Bluetooth::Serving {

/// A property that SetProperty changes, by a call with a value of exactly that type.
template <class Object>
struct Settable {
    const char* name;
    const char* type;
    void (Object::*set)(const CallPtr& call, const Value& value);
};

/// Lets an object answer SetProperty(s name, v value).
/// @return false, with the call unanswered, when it has no such property or not of that type
template <class Object>
bool setOneOf(std::initializer_list<Settable<Object>> properties, Object& object,
              const CallPtr& call) {
    const std::string name = call->text(0);
    const Value value = call->content(1);
    for (const Settable<Object>& property : properties) {
        if (name != property.name || !value.is(property.type))
            continue;
        (object.*property.set)(call, value);
        return true;
    }
    return false;
}

/// The arguments of PropertyChanged.
inline Value propertyChange(const char* name, const Value& value) {
    return tuple(name, boxed(value));
}

} // namespace Bluetooth::Serving

#endif
