// SPDX-License-Identifier: LGPL-2.1-or-later
#include "service_name.h"

namespace Scannerd {

namespace {

constexpr const char* serviceName = "com.kestrine.bluetooth";

} // namespace

ServiceName::ServiceName()
    : RemoteObject(DBUS_SERVICE_DBUS, DBUS_PATH_DBUS, DBUS_INTERFACE_DBUS, DBUS_BUS_SESSION) {}

std::string ServiceName::owner() {
    std::string owner;
    resetError();
    if (newMessage("GetNameOwner") == 0 && append(serviceName) == 0 && sendMessage(true, -1) == 0)
        getReplyValue(owner);
    return owner;
}

void ServiceName::release() {
    resetError();
    constexpr int limit = 1000; // ms, in which the calls before it are answered too
    if (newMessage("ReleaseName") == 0 && append(serviceName) == 0)
        sendMessage(true, limit);
}

} // namespace Scannerd
