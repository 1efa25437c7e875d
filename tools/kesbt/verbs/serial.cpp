// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/held_connection.h"
#include "daemon/profile.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/serial.h>

#include <iostream>

namespace Kesbt {

namespace {

using Bluetooth::Serial;

/// Asks the serial ports of a device, which it may not have. They have no properties.
/// @param unknown the Failure's text where there is no such port
void askPorts(const Options& options, const std::string& what, Serial& ports,
              const std::string& address, const char* method, const std::string& argument,
              const std::string& unknown) {
    try {
        ask(options, what, ports, method, argument.c_str());
    } catch (const Failure&) {
        if (lacksObject(ports))
            throw notOffered(adapterName(ports), address, "serial port");
        if (failedWith(ports, "DoesNotExist"))
            throw Failure(unknown);
        throw;
    }
}

void release(const Options& options, const std::string& address, Serial& ports,
             const std::string& terminal) {
    askPorts(options, "cannot disconnect " + terminal, ports, address, "Disconnect", terminal,
             quoted(terminal) + " is no terminal of " + address +
                 "; kesbt serial connect tells it when it connects one");
}

void connect(const Options& options, const std::string& address, const std::string& service) {
    BusFeed feed(BusFeed::Signals::All);
    const auto device = openDevice(options, address);
    const auto ports = made(Serial::getSerial(device->getPath()));
    askPorts(options, "cannot connect a serial port of " + address, *ports, address, "Connect",
             service,
             address + " has no " + quoted(service) +
                 "; see what it has: " + kesbtOn(adapterName(*ports)) + " services " + address);
    const std::string terminal = connectedName(*ports, address);
    const HeldConnection held = {address, "terminal", terminal, ports->getInterface()};
    held.hold(options, feed, *device);
    release(options, address, *ports, terminal);
    held.printEnd(options);
}

Action buildConnect(const Syntax& syntax) {
    const auto address = addAddress(syntax, knownDevices);
    auto service = std::make_shared<std::string>("spp");
    syntax.app
        .add_option("SERVICE", *service,
                    "Which port: a name such as spp (default) or dun, a\nUUID, or a channel from 1 "
                    "to 30")
        ->type_name("");
    return [&options = syntax.options, address, service] { connect(options, *address, *service); };
}

void disconnect(const Options& options, const std::string& address, const std::string& terminal) {
    const auto device = openDevice(options, address);
    release(options, address, *made(Serial::getSerial(device->getPath())), terminal);
    if (options.json)
        printDocument({{"address", address},
                       {"adapter", adapterName(*device)},
                       {"terminal", terminal},
                       {"disconnected", true}});
    else
        std::cout << "Disconnected " << printable(terminal) << " from " << address << '\n';
}

Action buildDisconnect(const Syntax& syntax) {
    const auto address = addAddress(syntax, knownDevices);
    auto terminal = std::make_shared<std::string>();
    syntax.app.add_option("TERMINAL", *terminal, "Which one, e.g. /dev/rfcomm0")
        ->required()
        ->type_name("");
    return [&options = syntax.options, address, terminal] {
        disconnect(options, *address, *terminal);
    };
}

} // namespace

const Verb serialVerb = {"serial",
                         "Devices",
                         "Use a serial port of a device as a terminal",
                         "kesbt serial connect 00:11:22:33:44:55\n"
                         "kesbt serial connect 00:11:22:33:44:55 spp --json",
                         {{"connect", "Connect, print the terminal, and hold it until Ctrl-C",
                           Limit::Stream, buildConnect},
                          {"disconnect", "Disconnect one; only for the program that connected it",
                           Limit::Steps, buildDisconnect}}};

} // namespace Kesbt
