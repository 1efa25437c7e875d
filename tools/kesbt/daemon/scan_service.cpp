// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/scan_service.h"

#include "command/limit.h"
#include "daemon/refusal.h"

#include <cstdlib>
#include <memory>

namespace Kesbt {

using Bluetooth::Scanner;

namespace {

constexpr char serviceName[] = "com.kestrine.bluetooth";

/// The service tells every value as text; programs get the types that other verbs give them.
Json typedValue(const std::string& name, const Json& text) {
    const std::string value = display(text);
    if (name == "RSSI" || name == "Class")
        return std::strtol(value.c_str(), nullptr, 10);
    if (name == "Paired" || name == "Trusted" || name == "LegacyPairing" || name == "Broadcaster")
        return value == "1";
    if (name != "UUIDs" || value.size() < 2)
        return value;
    Json list = Json::array();
    const std::string separator = ", ";
    for (std::string rest = value.substr(1, value.size() - 2); !rest.empty();) {
        const std::size_t end = rest.find(separator);
        list.push_back(rest.substr(0, end));
        rest = end == std::string::npos ? "" : rest.substr(end + separator.size());
    }
    return list;
}

std::string askOwner() {
    Bluetooth::RemoteObject bus("org.freedesktop.DBus", "/org/freedesktop/DBus",
                                "org.freedesktop.DBus", DBUS_BUS_SESSION);
    if (!bus.getConnection())
        throw Failure("the session bus cannot be reached; log in, or try: "
                      "dbus-run-session -- kesbt scan list");
    std::string owner;
    if (bus.newMessage("GetNameOwner") == 0 && bus.append(serviceName) == 0 &&
        bus.sendMessage(true, -1) == 0)
        bus.getReplyValue(owner);
    return owner;
}

Failure scanFailure(Scanner& scanner, const std::string& adapter) {
    const std::string error = scanner.getErrorName();
    if (error == "org.bluez.Error.NoSuchAdapter")
        return Failure("there is no adapter " + adapter + " any more; see: kesbt adapters");
    if (error == DBUS_ERROR_NAME_HAS_NO_OWNER)
        return daemonAbsent();
    const bool couldNotBeStarted = error.rfind("org.freedesktop.DBus.Error.Spawn.", 0) == 0;
    if (couldNotBeStarted || error == DBUS_ERROR_SERVICE_UNKNOWN)
        return Failure("the scanner service is not running; start it: kesbt-scannerd");
    return refusal("cannot ask the scanner service about " + adapter, error,
                   scanner.getErrorMessage());
}

} // namespace

std::string scanServiceOwner() {
    return withinLimit(askOwner);
}

std::map<std::string, Json> readFound(Scanner& scanner, const std::string& adapter) {
    const std::unique_ptr<std::vector<std::pair<std::string, Bluetooth::Dict*>>> devices(
        withinLimit([&] { return scanner.listDevices(adapter.c_str(), false); }));
    if (!devices)
        throw scanFailure(scanner, adapter);
    std::map<std::string, Json> result;
    for (const auto& [address, dict] : *devices) {
        const std::unique_ptr<Bluetooth::Dict> owned(dict);
        Json properties = Json::object();
        for (const auto& [name, value] : *owned)
            properties[name] = typedValue(name, toJson(value));
        result[address] = std::move(properties);
    }
    return result;
}

} // namespace Kesbt
