#ifndef KESBLUETOOTH_SERVING_BUS_BUS_ERROR_H
#define KESBLUETOOTH_SERVING_BUS_BUS_ERROR_H

#include <string>

namespace Bluetooth::Serving {

/// A D-Bus error reply: its name and its text.
struct BusError {
    std::string name;
    std::string text;
};

/// The error replies of bluetoothd, by the names that its sources and documents use.
namespace Errors {

inline BusError bluez(const char* name, const char* text) {
    return {std::string("org.bluez.Error.") + name, text};
}

inline BusError invalidArguments() {
    return bluez("InvalidArguments", "Invalid arguments in method call");
}
inline BusError alreadyExists() {
    return bluez("AlreadyExists", "Already Exists");
}
inline BusError notConnected() {
    return bluez("NotConnected", "Not Connected");
}
inline BusError alreadyConnected() {
    return bluez("AlreadyConnected", "Already Connected");
}
inline BusError inProgress() {
    return bluez("InProgress", "In Progress");
}
inline BusError notAvailable() {
    return bluez("NotAvailable", "Operation currently not available");
}
inline BusError doesNotExist() {
    return bluez("DoesNotExist", "Does Not Exist");
}
inline BusError notAuthorized() {
    return bluez("NotAuthorized", "Operation Not Authorized");
}
inline BusError noSuchAdapter() {
    return bluez("NoSuchAdapter", "No such adapter");
}
inline BusError agentNotAvailable() {
    return bluez("AgentNotAvailable", "Agent Not Available");
}
inline BusError notReady() {
    return bluez("NotReady", "Resource Not Ready");
}
inline BusError failed(const char* text) {
    return bluez("Failed", text);
}

} // namespace Errors
} // namespace Bluetooth::Serving

#endif
