// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/refusal.h"

#include "show/text.h"

#include <bluetooth/bluez_object.h>
#include <bluetooth/dbus_object.h>

namespace Kesbt {

namespace {

constexpr char trySimulation[] = "or try: bluez4-sim -- kesbt adapters";

#define KESBT_BLUEZ_ERROR "org.bluez.Error."

/// What the daemon's and the bus's errors mean for the user.
struct Advice {
    const char* error; // its name
    const char* text;
};

constexpr Advice advices[] = {
    {KESBT_BLUEZ_ERROR "NotReady",
     "the adapter is off, switch it on: kesbt adapter set Powered true"},
    {KESBT_BLUEZ_ERROR "ConnectionAttemptFailed",
     "make sure that the device is on and within reach"},
    {KESBT_BLUEZ_ERROR "Failed",
     "make sure that the device is on, within reach and not in use elsewhere"},
    {KESBT_BLUEZ_ERROR "AlreadyExists", "it is known already, see: kesbt devices"},
    {KESBT_BLUEZ_ERROR "DoesNotExist", "see what there is: kesbt devices"},
    {KESBT_BLUEZ_ERROR "InProgress", "wait until it is done, or stop it where it was begun"},
    {KESBT_BLUEZ_ERROR "NotAuthorized", "only the program that began it can do this"},
    {KESBT_BLUEZ_ERROR "InvalidArguments", "the daemon does not accept this value"},
    {KESBT_BLUEZ_ERROR "AuthenticationFailed",
     "check the PIN or passkey, and confirm on the device"},
    {KESBT_BLUEZ_ERROR "AuthenticationRejected",
     "check the PIN or passkey, and confirm on the device"},
    {KESBT_BLUEZ_ERROR "AuthenticationTimeout", "confirm on the device in time, then try again"},
    {KESBT_BLUEZ_ERROR "AuthenticationCanceled",
     "try again when the adapter and the device are on"},
    {KESBT_BLUEZ_ERROR "RepeatedAttempts", "wait a minute, then try again"},
    {KESBT_BLUEZ_ERROR "NotConnected", "connect it first: kesbt audio connect ADDRESS"},
    {KESBT_BLUEZ_ERROR "AgentNotAvailable", "register an agent first: kesbt agent"},
    {DBUS_ERROR_NO_REPLY, "the daemon may be busy, try again or give a longer --timeout"},
    {DBUS_ERROR_ACCESS_DENIED, "the bus does not allow it to this user, run it as root"},
};

const char* adviceFor(const std::string& errorName) {
    for (const Advice& advice : advices) {
        if (errorName == advice.error)
            return advice.text;
    }
    return nullptr;
}

/// The daemon ends some of its texts with a line break, and libdbus's are long.
std::string firstSentence(std::string text) {
    text = text.substr(0, text.find('\n'));
    return printable(text.substr(0, text.find(". ")));
}

} // namespace

Failure daemonAbsent() {
    const Bluetooth::DBusObject bus;
    return Failure((bus.getConnection()
                        ? std::string("bluetoothd is not running on the system bus; start it, ")
                        : std::string("the system bus cannot be reached; start dbus-daemon, ")) +
                   trySimulation);
}

Failure daemonLost() {
    return Failure("bluetoothd has left the system bus; start it again and repeat the command");
}

Failure adapterRemoved(const std::string& adapter) {
    return Failure(adapter + " was removed; plug it in and repeat the command");
}

Failure adapterOff(const std::string& adapter) {
    return Failure(adapter + " was switched off; switch it on: kesbt adapter set Powered true");
}

Failure refusal(const std::string& what, Bluetooth::RemoteObject& proxy) {
    const std::string interface = proxy.getInterface();
    if (lacksObject(proxy) && interface == "org.bluez.Adapter")
        return adapterRemoved(lastComponent(proxy.getPath()));
    // BlueZ 5 has the same bus name and other objects.
    if (lacksObject(proxy) && interface == "org.bluez.Manager")
        return Failure(std::string("the bluetoothd on the system bus is not one of BlueZ 4; "
                                   "install that, ") +
                       trySimulation);
    return Bluetooth::BluezObject::hasBluetoothd()
               ? refusal(what, proxy.getErrorName(), proxy.getErrorMessage())
               : daemonAbsent();
}

Failure refusal(const std::string& what, const std::string& errorName, const std::string& reason) {
    const char* advice = adviceFor(errorName);
    std::string line = what;
    if (!reason.empty())
        line += ": " + firstSentence(reason);
    return Failure(line + "; " +
                   (advice ? advice : "see what happens meanwhile with: kesbt monitor"));
}

bool failedWith(const Bluetooth::RemoteObject& proxy, const char* error) {
    return proxy.getErrorName() == std::string(KESBT_BLUEZ_ERROR) + error;
}

bool lacksObject(const Bluetooth::RemoteObject& proxy) {
    const std::string error = proxy.getErrorName();
    return error == DBUS_ERROR_UNKNOWN_METHOD || error == DBUS_ERROR_UNKNOWN_OBJECT ||
           error == DBUS_ERROR_UNKNOWN_INTERFACE;
}

} // namespace Kesbt
