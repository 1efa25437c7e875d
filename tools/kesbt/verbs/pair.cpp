// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/creation.h"
#include "daemon/objects.h"
#include "daemon/shown_agent.h"
#include "show/text.h"
#include "verbs/list.h"

#include <iostream>

namespace Kesbt {

namespace {

/// What became of the requests while a pairing was under way.
struct Requests {
    std::string shown; ///< a passkey to type may be told again with each key
    std::string advice;
    bool isRefused = false;

    void tell(const AgentRequest& request) {
        const bool isEnd = request.method == "Release" || request.method == "Cancel";
        const std::string text = request.text();
        if (!isEnd && !request.wasAsked && text != shown)
            std::cerr << printable(text) << '\n';
        shown = text;
        advice = request.advice.empty() ? advice : request.advice;
        isRefused = isRefused || request.answer == "rejected";
    }
};

std::unique_ptr<Bluetooth::Device> createPaired(const Options& options, Bluetooth::Adapter& adapter,
                                                const std::string& address,
                                                const AgentSettings& settings) {
    const std::string what = "cannot pair with " + address;
    Requests requests;
    ShownAgent agent(settings,
                     [&requests](const AgentRequest& request) { requests.tell(request); });
    Watchdog::Task task = creationTask(adapter, address, "pairing with");
    task.showsProgress = true;
    task.questions = &agent.questions();
    std::unique_ptr<Bluetooth::Device> device;
    { // whose thread gives the answers of the person, and tells about them
        const Watchdog watchdog(options.limit, std::move(task));
        device.reset(adapter.createPairedDevice(address.c_str(), agent));
        if (!device)
            watchdog.throwIfCancelled();
    }
    if (device)
        return device;
    if (!requests.advice.empty())
        throw Failure(what + ": " + requests.advice);
    if (requests.isRefused)
        throw Failure(what + ": it was refused here; repeat the command to answer otherwise");
    throw refusal(what, adapter);
}

void pair(const Options& options, const std::string& address, const AgentSettings& settings) {
    const auto adapter = openAdapter(options);
    std::cerr << "Pairing with " << address << " on " << adapterName(*adapter)
              << " (Ctrl-C stops it)\n";
    const auto device = createPaired(options, *adapter, address, settings);
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
                       "kesbt pair 00:11:22:33:44:55 --yes --json\n"
                       "kesbt pair 00:11:22:33:44:55 --capability NoInputNoOutput",
                       {{Limit::OnlyGiven, build}}};

} // namespace Kesbt
