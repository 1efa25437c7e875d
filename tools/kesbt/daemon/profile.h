// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_DAEMON_PROFILE_H
#define KESBT_DAEMON_PROFILE_H

#include "daemon/objects.h"

#include <memory>
#include <string>

namespace Kesbt {

/// The proxy that one of the library's factories has made. A Failure without the daemon.
template <class Proxy>
std::unique_ptr<Proxy> made(Proxy* created) {
    std::unique_ptr<Proxy> proxy(created);
    if (!proxy)
        throw daemonLost();
    return proxy;
}

/// A known device and one of the interfaces that it has by its services.
template <class Proxy>
struct Profile {
    /// @param what for the Failure that tells that the device has none, e.g. "audio"
    Profile(const Options& options, const std::string& address, Proxy* (*create)(const char*),
            const std::string& what)
        : device(openDevice(options, address)), proxy(made(create(device->getPath()))) {
        if (readOptional(*proxy).is_null())
            throw notOffered(adapterName(*device), address, what);
    }

    /// @param member how a program gets the interface's properties, e.g. "input"
    void print(const Options& options, const std::string& address, const char* member) const {
        const Json properties = readProperties(*proxy);
        if (options.json)
            printDocument(
                {{"address", address}, {"adapter", adapterName(*device)}, {member, properties}});
        else
            printProperties(properties);
    }

    std::unique_ptr<Bluetooth::Device> device;
    std::unique_ptr<Proxy> proxy;
};

/// Connects or disconnects an interface, unless it is so, and waits until it is: the daemon refuses
/// what is so already. Both read "Connected".
/// @param subject how messages name it, e.g. "the sink of 00:11:22:33:44:55"
void setConnected(const Options& options, Bluetooth::BluezObject& proxy, const std::string& subject,
                  bool connected);

} // namespace Kesbt

#endif
