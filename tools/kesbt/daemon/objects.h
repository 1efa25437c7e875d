// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_OBJECTS_H
#define KESBT_DAEMON_OBJECTS_H

#include "command/options.h"
#include "daemon/refusal.h"
#include "show/output.h"
#include "wait/waiting.h"

#include <bluetooth/adapter.h>
#include <bluetooth/device.h>
#include <bluetooth/device_list.h>
#include <bluetooth/manager.h>

#include <memory>
#include <string>
#include <vector>

/// @file
/// The daemon's objects as the verbs need them: there, or a Failure that says what to do.

namespace Kesbt {

std::unique_ptr<Bluetooth::Manager> openManager();

/// The adapter that the user chose with --adapter, else the daemon's default one.
std::unique_ptr<Bluetooth::Adapter> openAdapter(const Options& options);
std::unique_ptr<Bluetooth::Adapter> openAdapter(Bluetooth::Manager& manager,
                                                const Options& options);

/// Why the adapter cannot go on that says it is off: it says so too when it is unplugged.
Failure adapterLost(Bluetooth::Adapter& adapter);

/// What can be offered where an adapter or a known device of the chosen adapter is to be named.
std::vector<std::string> adapterNames(const Options& options);
std::vector<std::string> knownDevices(const Options& options);

/// The path of the daemon's default adapter; "" without one.
std::string defaultAdapterPath(Bluetooth::Manager& manager);

/// A device that the adapter knows; null when the daemon does not say that it does.
std::unique_ptr<Bluetooth::Device> findDevice(Bluetooth::Adapter& adapter,
                                              const std::string& address);
/// The same, and a Failure without it.
std::unique_ptr<Bluetooth::Device> openDevice(Bluetooth::Adapter& adapter,
                                              const std::string& address);
std::unique_ptr<Bluetooth::Device> openDevice(const Options& options, const std::string& address);

/// "hci0" of the adapter, or of the adapter that a device is on.
std::string adapterName(const Bluetooth::RemoteObject& object);

/// The properties that the daemon tells (for an adapter without "HCIVersion").
Bluetooth::Dict readDict(Bluetooth::BluezObject& object);
Json readProperties(Bluetooth::BluezObject& object);

/// The properties of a device that the adapter may not know yet; null then. It is one step.
Json readIfKnown(Bluetooth::Adapter& adapter, const std::string& address);

/// The properties of an interface that not every device has; null without it.
Json readOptional(Bluetooth::BluezObject& object);

/// An object and its properties as programs get them: a device's "address" or an adapter's
/// "default", then "adapter", "path" and "properties".
Json describe(const Bluetooth::Adapter& adapter, bool isDefault, Json properties);
Json describe(const Bluetooth::Device& device, Json properties);

/// Shows devices to the user.
void printDevices(const Options& options, const Bluetooth::DeviceList& devices);
void printDevice(const Options& options, Bluetooth::Device& device);

/// Calls a method and waits for the daemon's verdict. The proxies' own operations do not wait for
/// it; a program that owes its user a reason asks for the reply itself.
/// @param what what is not possible when the daemon refuses, e.g. "cannot remove DEVICE"
template <class... Args>
void ask(const Options& options, const std::string& what, Bluetooth::RemoteObject& proxy,
         const char* method, const Args&... args) {
    proxy.resetError();
    const int timeoutMs = static_cast<int>(options.limit.step().count());
    if (proxy.newMessage(method) < 0 || (... || (proxy.append(args) < 0)) || proxy.hasError() ||
        proxy.sendMessage(true, timeoutMs) < 0)
        throw options.limit.canBeLonger() && hasTimedOut(proxy) ? notConfirmed(what)
                                                                : refusal(what, proxy);
}

} // namespace Kesbt

#endif
