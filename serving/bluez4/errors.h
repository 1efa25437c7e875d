// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_ERRORS_H
#define KESBLUETOOTH_SERVING_BLUEZ4_ERRORS_H

#include "serving/bus/bus_error.h"

#include <string>

namespace Bluetooth::Serving {

/// An error reply of bluetoothd, named without the `org.bluez.Error.` that all begin with.
struct BluezError {
    const char* name;
    const char* text;

    operator BusError() const { return {std::string("org.bluez.Error.") + name, text}; }
};

/// The errors of BlueZ 4.101, by the names that its sources and documents use.
namespace Errors {

constexpr BluezError agentNotAvailable{"AgentNotAvailable", "Agent Not Available"};
constexpr BluezError alreadyConnected{"AlreadyConnected", "Already Connected"};
constexpr BluezError alreadyExists{"AlreadyExists", "Already Exists"};
/// InProgress as well, with the other text that the daemon has for it.
constexpr BluezError busy{"InProgress", "Operation already in progress"};
constexpr BluezError doesNotExist{"DoesNotExist", "Does Not Exist"};
constexpr BluezError inProgress{"InProgress", "In Progress"};
constexpr BluezError invalidArguments{"InvalidArguments", "Invalid arguments in method call"};
constexpr BluezError noSuchAdapter{"NoSuchAdapter", "No such adapter"};
constexpr BluezError notAuthorized{"NotAuthorized", "Operation Not Authorized"};
constexpr BluezError notAvailable{"NotAvailable", "Operation currently not available"};
constexpr BluezError notConnected{"NotConnected", "Not Connected"};
constexpr BluezError notReady{"NotReady", "Resource Not Ready"};
constexpr BluezError notSupported{"NotSupported", "Operation is not supported"};
constexpr BluezError authenticationCanceled{"AuthenticationCanceled", "Authentication Canceled"};
constexpr BluezError authenticationFailed{"AuthenticationFailed", "Authentication Failed"};
constexpr BluezError authenticationRejected{"AuthenticationRejected", "Authentication Rejected"};
constexpr BluezError authenticationTimeout{"AuthenticationTimeout", "Authentication Timeout"};
constexpr BluezError repeatedAttempts{"RepeatedAttempts", "Repeated Attempts"};

/// The two errors whose text differs from case to case.
constexpr BluezError failed(const char* text) {
    return {"Failed", text};
}
constexpr BluezError connectionAttemptFailed(const char* text) {
    return {"ConnectionAttemptFailed", text};
}

} // namespace Errors
} // namespace Bluetooth::Serving

#endif
