// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_CALLBACKS_H
#define KESBLUETOOTH_TESTS_CALLBACKS_H

#include "support/latch.h"

#include <bluetooth/dict_codec.h>
#include <bluetooth/remote_object.h>

namespace Bluetooth::Test {

/// Each is a callback for one kind of signal, and says "KIND RECEIVER'S-PATH VALUES".
inline void onNothing(RemoteObject* receiver) {
    seen().add(std::string("nothing ") + receiver->getPath());
}
inline void onString(RemoteObject* receiver, const char* text) {
    seen().add(std::string("string ") + receiver->getPath() + " " + text);
}
inline void onPath(RemoteObject* receiver, const ObjectPath* path) {
    seen().add(std::string("path ") + receiver->getPath() + " " + path->str());
}
inline void onVariant(RemoteObject* receiver, const char* name, const Variant* value) {
    seen().add(std::string("variant ") + receiver->getPath() + " " + name + "=" +
               variantToString(*value));
}
inline void onDict(RemoteObject* receiver, const char* text, const Dict* dict) {
    seen().add(std::string("dict ") + receiver->getPath() + " " + text + " " +
               dictConquerToString(*dict, ";"));
}

} // namespace Bluetooth::Test

#endif
