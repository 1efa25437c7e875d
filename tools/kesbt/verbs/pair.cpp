// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/creation.h"
#include "daemon/objects.h"
#include "daemon/shown_agent.h"
#include "show/text.h"
#include "verbs/list.h"

#include <iostream>

namespace Kesbt {

namespace {

std::unique_ptr<Bluetooth::Device> createPaired(const Options& options, Bluetooth::Adapter& adapter,
                                                const std::string& address,
                                                const AgentSettings& settings) {
    std::string shown; // a passkey to type is told again with each key
    const ShownAgent agent(settings, [&shown](const AgentRequest& request) {
        const bool isEnd = request.method == "Release" || request.method == "Cancel";
        if (!isEnd && request.text() != shown)
            std::cerr << printable(request.text()) << '\n';
        shown = request.text();
    });
    Watchdog::Task task = creationTask(adapter, address, "pairing with");
    task.showsProgress = true;
    const Watchdog watchdog(options.limit, std::move(task));
    std::unique_ptr<Bluetooth::Device> device(adapter.createPairedDevice(address.c_str(), agent));
    if (!device)
        watchdog.throwIfCancelled();
    return device;
}

void pair(const Options& options, const std::string& address, const AgentSettings& settings) {
    const auto adapter = openAdapter(options);
    std::cerr << "Pairing with " << address << " on " << adapterName(*adapter)
              << " (Ctrl-C stops it)\n";
    const auto device = createPaired(options, *adapter, address, settings);
    if (!device)
        throw refusal("cannot pair with " + address, *adapter);
    const auto isPaired = [&] { return readProperties(*device).value("Paired", false); };
    if (!waitUntil(isPaired, options.limit.step()))
        throw notConfirmed(address + " is not paired");
    printDevice(options, *device);
}

Action build(const Syntax& syntax) {
    return [&options = syntax.options, address = addAddress(syntax),
            settings = addAgentOptions(syntax)] { pair(options, *address, *settings); };
}

} // namespace

const Verb pairVerb = {"pair",
                       "Pairing",
                       "Pair with a device and make it known",
                       "kesbt pair 00:11:22:33:44:55\n"
                       "kesbt pair 00:11:22:33:44:55 --pin 1234\n"
                       "kesbt pair 00:11:22:33:44:55 --capability NoInputNoOutput",
                       {{Limit::OnlyGiven, build}}};

} // namespace Kesbt
