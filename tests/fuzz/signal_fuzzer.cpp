// SPDX-License-Identifier: LGPL-2.1-or-later
// Any signal, offered to a dispatcher that has subscribers; the input's first byte chooses which.

#include "fuzz/message_source.h"
#include "support/private_bus.h"

#include <bluetooth/dict_codec.h>
#include <bluetooth/remote_object.h>

#include <cstdlib>
#include <cstring>
#include <string>

using namespace Bluetooth;

namespace {

/// Reads a text to its end.
void look(const std::string& text) {
    if (strlen(text.c_str()) > text.size())
        abort();
}

RemoteObject* subscribe() {
    static const Test::PrivateBus bus(Test::PrivateBus::Kind::Session);
    auto* proxy = new RemoteObject("org.bluez", Fuzz::path, Fuzz::interface, DBUS_BUS_SESSION);
    const auto onNothing = [](RemoteObject*) {};
    const auto onString = [](RemoteObject*, const char* text) { look(text); };
    const auto onPath = [](RemoteObject*, const ObjectPath* path) { look(*path); };
    const auto onVariant = [](RemoteObject*, const char* name, const Variant* value) {
        look(dictToString({{name, *value}}));
    };
    const auto onDict = [](RemoteObject*, const char* text, const Dict* dict) {
        look(dictConquerToString(*dict, text));
    };
    if (proxy->setSignalHandlerNoArgument(Fuzz::member, onNothing) != 0 ||
        proxy->setSignalHandlerString(Fuzz::member, onString) != 0 ||
        proxy->setSignalHandlerObjectPath(Fuzz::member, onPath) != 0 ||
        proxy->setSignalHandlerStringVariant(Fuzz::member, onVariant) != 0 ||
        proxy->setSignalHandlerStringDict(Fuzz::member, onDict) != 0)
        abort();
    return proxy;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static RemoteObject& proxy = *subscribe();
    constexpr void (RemoteObject::*dispatchers[])(DBusMessage*) = {
        &RemoteObject::signalHandlerDispatcherNoArgument,
        &RemoteObject::signalHandlerDispatcherString,
        &RemoteObject::signalHandlerDispatcherObjectPath,
        &RemoteObject::signalHandlerDispatcherStringVariant,
        &RemoteObject::signalHandlerDispatcherStringDict};
    FuzzedDataProvider bytes(data, size);
    const auto dispatcher = bytes.PickValueInArray(dispatchers);
    const MessagePtr signal =
        Fuzz::takeMessage(bytes, DBUS_MESSAGE_TYPE_SIGNAL, Fuzz::interface, Fuzz::member);
    (proxy.*dispatcher)(signal.get());
    return 0;
}
