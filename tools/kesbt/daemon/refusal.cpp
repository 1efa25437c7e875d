// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/refusal.h"

#include "show/text.h"

#include <bluetooth/bluez_object.h>
#include <bluetooth/dbus_object.h>

#include <cstring>

namespace Kesbt {

namespace {

constexpr char trySimulation[] = "or try: bluez4-sim -- kesbt adapters";

/// What the daemon's and the bus's error texts mean for the user.
struct Advice {
    const char* beginning; // of the error's text
    const char* text;
};

constexpr Advice advices[] = {
    {"Resource Not Ready", "the adapter is off, switch it on: kesbt adapter set Powered true"},
    {"Host is down", "make sure that the device is on and within reach"},
    {"Page Timeout", "make sure that the device is on and within reach"},
    {"Connection Timeout", "make sure that the device is on and within reach"},
    {"No route to host", "make sure that the adapter and the device are on"},
    {"Already Exists", "it is known already, see: kesbt devices"},
    {"Does Not Exist", "see what there is: kesbt devices"},
    {"In Progress", "wait until it is done, or stop it where it was begun"},
    {"Device creation in progress", "wait until it is done, or stop it where it was begun"},
    {"Operation Not Authorized", "only the program that began it can do this"},
    {"Invalid arguments", "the daemon does not accept this value"},
    {"Authentication Failed", "check the PIN or passkey, and confirm on the device"},
    {"Authentication Rejected", "check the PIN or passkey, and confirm on the device"},
    {"Authentication Timeout", "confirm on the device in time, then try again"},
    {"Authentication Canceled", "try again when the adapter and the device are on"},
    {"Repeated Attempts", "wait a minute, then try again"},
    {"Connect Failed", "make sure that the device is on and not in use elsewhere"},
    {"Not Connected", "connect it first: kesbt audio connect ADDRESS"},
    {"Agent Not Available", "register an agent first: kesbt agent"},
    {"Did not receive a reply", "the daemon may be busy, try again or give a longer --timeout"},
    {"Message recipient disconnected", "bluetoothd ended meanwhile, start it again"},
    {"Rejected send message", "the bus does not allow it to this user, run it as root"},
};

const char* adviceFor(const std::string& reason) {
    for (const Advice& advice : advices) {
        if (reason.compare(0, std::strlen(advice.beginning), advice.beginning) == 0)
            return advice.text;
    }
    return nullptr;
}

/// Whether the daemon has no such object (any more).
bool lacks(const std::string& reason, const std::string& interface) {
    return reason.find('"' + interface + "\" doesn't exist") != std::string::npos;
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
    const std::string reason = proxy.getErrorMessage();
    if (lacks(reason, "org.bluez.Adapter"))
        return adapterRemoved(lastComponent(proxy.getPath()));
    return Bluetooth::BluezObject::hasBluetoothd() ? refusal(what, reason) : daemonAbsent();
}

Failure refusal(const std::string& what, const std::string& reason) {
    // BlueZ 5 has the same bus name and other objects.
    if (lacks(reason, "org.bluez.Manager"))
        return Failure(std::string("the bluetoothd on the system bus is not one of BlueZ 4; "
                                   "install that, ") +
                       trySimulation);
    const char* advice = adviceFor(reason);
    std::string line = what;
    if (!reason.empty())
        line += ": " + firstSentence(reason);
    return Failure(line + "; " +
                   (advice ? advice : "see what happens meanwhile with: kesbt monitor"));
}

} // namespace Kesbt
