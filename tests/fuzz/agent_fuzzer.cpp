// SPDX-License-Identifier: LGPL-2.1-or-later
// Any message to the pairing agent. Its answers go to a connection that is closed.

#include "fuzz/message_source.h"

#include <bluetooth/agent.h>

#include <cstdlib>

using namespace Bluetooth;

namespace {

DBusConnection* closedConnection() {
    DBusServer* server = dbus_server_listen("unix:tmpdir=/tmp", nullptr); // nobody accepts
    char* address = dbus_server_get_address(server);
    DBusConnection* connection = dbus_connection_open_private(address, nullptr);
    dbus_connection_close(connection);
    dbus_free(address);
    dbus_server_disconnect(server);
    dbus_server_unref(server);
    return connection;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static DBusConnection* const connection = closedConnection();
    constexpr const char* methods[] = {"RequestPinCode", "RequestPasskey",   "RequestConfirmation",
                                       "Authorize",      "Cancel",           "Release",
                                       "DisplayPasskey", "ConfirmModeChange"};
    FuzzedDataProvider bytes(data, size);
    Agent agent;
    agent.setReject(bytes.ConsumeBool());
    agent.setPasskeyValue(bytes.ConsumeRandomLengthString(20).c_str());
    const char* method = bytes.PickValueInArray(methods);
    const MessagePtr request =
        Fuzz::takeMessage(bytes, DBUS_MESSAGE_TYPE_METHOD_CALL, agent.getInterface(), method);
    if (Agent::handlerDispatcher(connection, request.get(), &agent) > 2)
        abort(); // none of the three results
    return 0;
}
