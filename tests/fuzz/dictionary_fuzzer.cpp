// SPDX-License-Identifier: LGPL-2.1-or-later
// Any reply, read as each of the types that a reply can be read as.

#include "fuzz/message_source.h"

#include <bluetooth/remote_object.h>

#include <cstdlib>

using namespace Bluetooth;

namespace {

template <class Value>
void read(RemoteObject& proxy, DBusMessage* reply) {
    Value value{};
    proxy.resetError();
    proxy.setReplyMessage(dbus_message_ref(reply));
    if ((proxy.getReplyValue(value) != 0) != proxy.hasError())
        abort(); // a failure without an error, or the other way round
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static RemoteObject& proxy = *[] {
        setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/nonexistent", 1);
        return new RemoteObject("org.bluez", Fuzz::path, Fuzz::interface, DBUS_BUS_SESSION);
    }();
    FuzzedDataProvider bytes(data, size);
    const MessagePtr reply =
        Fuzz::takeMessage(bytes, DBUS_MESSAGE_TYPE_METHOD_RETURN, Fuzz::interface, Fuzz::member);
    if (!reply)
        return 0;
    read<Dict>(proxy, reply.get());
    read<std::string>(proxy, reply.get());
    read<bool>(proxy, reply.get());
    read<ObjectPath>(proxy, reply.get());
    read<std::vector<std::string>>(proxy, reply.get());
    read<std::vector<ObjectPath>>(proxy, reply.get());
    return 0;
}
