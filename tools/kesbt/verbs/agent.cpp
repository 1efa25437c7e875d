// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"
#include "daemon/objects.h"
#include "daemon/shown_agent.h"
#include "show/style.h"
#include "show/text.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

namespace {

void printLine(const std::string& text) {
    std::cout << coloured(timeForPeople(), Colour::Dim) << "  " << printable(text) << '\n';
    flushOutput();
}

void printRequest(const Options& options, const AgentRequest& request) {
    if (!request.advice.empty())
        std::cerr << printable(request.text()) << ", for " << request.advice << '\n';
    if (!options.json) {
        printLine(request.text());
        return;
    }
    Json line = {{"event", "request"}, {"time", timeForPrograms()}, {"request", request.method}};
    if (!request.address.empty())
        line["address"] = request.address;
    if (!request.detail.empty())
        line["detail"] = request.detail;
    line["answer"] = request.answer;
    printEvent(line);
}

void registerAgent(const Options& options, Bluetooth::Adapter& adapter, const ShownAgent& agent) {
    const std::string name = adapterName(adapter);
    try {
        ask(options, "cannot register an agent on " + name, adapter, "RegisterAgent",
            Bluetooth::ObjectPath(agent.getPath()), agent.getCapability());
    } catch (const Failure&) {
        if (failedWith(adapter, "AlreadyExists"))
            throw Failure(name + " has an agent of another program; end that program first");
        throw;
    }
    if (options.json)
        printEvent({{"event", "registered"}, {"time", timeForPrograms()}, {"adapter", name}});
    else
        printLine("Agent registered on " + name + ", waiting for requests (Ctrl-C ends it)");
}

void answerRequests(DBusConnection* connection) {
    dbus_connection_read_write(connection, 0);
    while (dbus_connection_dispatch(connection) == DBUS_DISPATCH_DATA_REMAINS) {
    }
}

bool hasDaemonGone(BusFeed& daemon) {
    bool hasGone = false;
    for (BusSignal signal; daemon.next(signal);)
        hasGone = hasGone || BusFeed::isDaemonGone(signal);
    return hasGone;
}

/// Answers requests until the user interrupts. The library's receive thread does not run here: it
/// would drop them.
void serve(DBusConnection* connection, ShownAgent& agent, BusFeed& daemon, Interrupt& interrupt) {
    Questions& questions = agent.questions();
    while (!interrupt.came()) {
        int fd = -1;
        dbus_connection_get_unix_fd(connection, &fd);
        // What came with the answer to a call waits in the queue, where no descriptor tells of it.
        const bool isQueued =
            dbus_connection_get_dispatch_status(connection) == DBUS_DISPATCH_DATA_REMAINS;
        waitForInput({fd, daemon.fd(), interrupt.fd(), questions.wakeFd(), questions.inputFd()},
                     isQueued ? Clock::now() : questions.due());
        answerRequests(connection);
        questions.attend();
        const bool hasGone = hasDaemonGone(daemon);
        if (hasGone) {
            // What it asked last comes on the other connection, and is there after any answer of
            // the bus.
            Bluetooth::BluezObject::hasBluetoothd();
            answerRequests(connection);
        }
        if (agent.isReleased())
            throw Failure("bluetoothd has released the agent; register it again: kesbt agent");
        if (hasGone)
            throw daemonLost();
    }
}

void runAgent(const Options& options, const AgentSettings& settings) {
    if (!settings.canAnswer())
        throw wrongUsage(nobodyToAsk("--yes, --pin TEXT or --reject"));
    Interrupt interrupt;
    const auto adapter = openAdapter(options);
    BusFeed daemon(BusFeed::Signals::Presence);
    ShownAgent agent(settings,
                     [&options](const AgentRequest& request) { printRequest(options, request); });
    registerAgent(options, *adapter, agent);
    serve(adapter->getConnection(), agent, daemon, interrupt);
    agent.questions().end();
    ask(options, "cannot unregister the agent", *adapter, "UnregisterAgent",
        Bluetooth::ObjectPath(agent.getPath()));
}

Action build(const Syntax& syntax) {
    return [&options = syntax.options, settings = addAgentOptions(syntax)] {
        runAgent(options, *settings);
    };
}

} // namespace

const Verb agentVerb = {"agent",
                        "Pairing",
                        "Answer devices that want to pair, until Ctrl-C",
                        "kesbt agent --pin 1234\n"
                        "kesbt --adapter hci1 agent --reject\nkesbt agent --yes --json",
                        {{Limit::Stream, build}}};

} // namespace Kesbt
