// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/refusal.h"

#include "show/text.h"

#include <bluetooth/bluez_object.h>
#include <bluetooth/dbus_object.h>

#include <sstream>

namespace Kesbt {

namespace {

constexpr char trySimulation[] = "or try: bluez4-sim -- kesbt adapters";

#define KESBT_BLUEZ_ERROR "org.bluez.Error."

/// What the daemon's and the bus's errors mean for the user.
struct Advice {
    const char* error;  // its name
    const char* reason; // what stands in its text, where that makes a difference; null for any
    const char* text;   // {kesbt} stands for the program with the adapter that was asked
};

constexpr Advice advices[] = {
    {KESBT_BLUEZ_ERROR "NotReady", nullptr,
     "the adapter is off, switch it on: {kesbt} adapter set Powered true"},
    {KESBT_BLUEZ_ERROR "Failed", "No route to host",
     "the adapter is off, switch it on: {kesbt} adapter set Powered true"},
    {KESBT_BLUEZ_ERROR "ConnectionAttemptFailed", nullptr,
     "make sure that the device is on and within reach"},
    // So one of the daemon's two backends calls a device that is not there.
    {KESBT_BLUEZ_ERROR "Failed", "Operation canceled",
     "the device does not answer or was disconnected, make sure that it is on and within reach"},
    {KESBT_BLUEZ_ERROR "Failed", "Operation already in progress",
     "wait until it is done, then try again"},
    {KESBT_BLUEZ_ERROR "Failed", nullptr,
     "make sure that the device is on, within reach and not in use elsewhere"},
    {KESBT_BLUEZ_ERROR "AlreadyExists", nullptr, "it is known already, see: {kesbt} devices"},
    {KESBT_BLUEZ_ERROR "DoesNotExist", nullptr, "see what there is: {kesbt} devices"},
    {KESBT_BLUEZ_ERROR "InProgress", nullptr,
     "wait until it is done, or stop it where it was begun"},
    {KESBT_BLUEZ_ERROR "NotAuthorized", nullptr, "only the program that began it can do this"},
    {KESBT_BLUEZ_ERROR "InvalidArguments", nullptr, "the daemon does not accept this value"},
    {KESBT_BLUEZ_ERROR "AuthenticationFailed", nullptr,
     "check the PIN or passkey, and confirm on the device"},
    {KESBT_BLUEZ_ERROR "AuthenticationRejected", nullptr,
     "check the PIN or passkey, and confirm on the device"},
    {KESBT_BLUEZ_ERROR "AuthenticationTimeout", nullptr,
     "confirm on the device in time, then try again"},
    {KESBT_BLUEZ_ERROR "AuthenticationCanceled", nullptr,
     "try again when the adapter and the device are on"},
    {KESBT_BLUEZ_ERROR "RepeatedAttempts", nullptr, "wait a minute, then try again"},
    {KESBT_BLUEZ_ERROR "NotConnected", nullptr, "connect it first: {kesbt} audio connect ADDRESS"},
    {KESBT_BLUEZ_ERROR "NotSupported", nullptr, "the device does not offer it"},
    {KESBT_BLUEZ_ERROR "AgentNotAvailable", nullptr, "register an agent first: {kesbt} agent"},
    {DBUS_ERROR_NO_REPLY, nullptr,
     "the daemon may be busy, try again; if it hangs, restart it as root: kesbt restart-daemon"},
    {DBUS_ERROR_ACCESS_DENIED, nullptr, "the bus does not allow it to this user, run it as root"},
};

const char* adviceFor(const std::string& errorName, const std::string& reason) {
    for (const Advice& advice : advices) {
        if (errorName == advice.error &&
            (!advice.reason || reason.find(advice.reason) != std::string::npos))
            return advice.text;
    }
    return "see what happens meanwhile with: kesbt monitor";
}

/// "hci0" of an adapter's path and of those below it; "" of any other.
std::string adapterIn(const std::string& path) {
    const std::string name = lastComponent(path.substr(0, path.find("/dev_")));
    return name.rfind("hci", 0) == 0 ? name : "";
}

std::string withAdapter(std::string advice, const std::string& adapter) {
    constexpr char mark[] = "{kesbt}";
    const std::size_t place = advice.find(mark);
    if (place != std::string::npos)
        advice.replace(place, sizeof mark - 1, adapter.empty() ? "kesbt" : kesbtOn(adapter));
    return advice;
}

/// The line that says most: of a traceback the last one, which names the exception, of other texts
/// the first one. The daemon ends some of its texts with a line break.
std::string tellingLine(const std::string& text) {
    std::istringstream lines(text);
    std::string telling;
    for (std::string line; std::getline(lines, line);) {
        if (line.find_first_not_of(" \t\r") == std::string::npos)
            continue;
        const bool isFirst = telling.empty();
        telling = line;
        if (isFirst && line.rfind("Traceback", 0) != 0)
            break;
    }
    return telling;
}

/// libdbus's texts are long.
std::string firstSentence(const std::string& text) {
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
    return Failure(adapter + " is off; switch it on: " + kesbtOn(adapter) +
                   " adapter set Powered true");
}

Failure unknownDevice(const std::string& adapter, const std::string& address) {
    const std::string kesbt = kesbtOn(adapter);
    return Failure(adapter + " does not know " + address + "; see what it knows: " + kesbt +
                   " devices, or make it known: " + kesbt + " create " + address);
}

Failure notOffered(const std::string& adapter, const std::string& address,
                   const std::string& what) {
    return Failure(address + " has no " + what + "; see what it has: " + kesbtOn(adapter) +
                   " services " + address);
}

std::string kesbtOn(const std::string& adapter) {
    return "kesbt --adapter " + adapter;
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
               ? refusal(what, proxy.getErrorName(), proxy.getErrorMessage(),
                         adapterIn(proxy.getPath()))
               : daemonAbsent();
}

Failure refusal(const std::string& what, const std::string& errorName, const std::string& text,
                const std::string& adapter) {
    const std::string reason = tellingLine(text);
    return Failure(what + ": " + (reason.empty() ? printable(errorName) : firstSentence(reason)) +
                   "; " + withAdapter(adviceFor(errorName, reason), adapter));
}

bool failedWith(const Bluetooth::RemoteObject& proxy, const char* error) {
    return proxy.getErrorName() == std::string(KESBT_BLUEZ_ERROR) + error;
}

bool hasTimedOut(const Bluetooth::RemoteObject& proxy) {
    return proxy.getErrorName() == std::string(DBUS_ERROR_NO_REPLY) &&
           Bluetooth::BluezObject::hasBluetoothd();
}

bool lacksObject(const Bluetooth::RemoteObject& proxy) {
    const std::string error = proxy.getErrorName();
    return error == DBUS_ERROR_UNKNOWN_METHOD || error == DBUS_ERROR_UNKNOWN_OBJECT ||
           error == DBUS_ERROR_UNKNOWN_INTERFACE;
}

} // namespace Kesbt
