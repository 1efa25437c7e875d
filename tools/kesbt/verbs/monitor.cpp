// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/bus_feed.h"
#include "daemon/objects.h"
#include "show/style.h"
#include "show/text.h"
#include "verbs/list.h"
#include "wait/waiting.h"

#include <iostream>

namespace Kesbt {

namespace {

/// "hci0", "hci0/00:11:22:33:44:55" or, for the manager, "/".
std::string shortPath(const std::string& path) {
    constexpr char deviceMark[] = "/dev_";
    const std::size_t device = path.find(deviceMark);
    const std::string adapter = lastComponent(path.substr(0, device));
    if (device == std::string::npos)
        return adapter.empty() ? path : adapter;
    std::string address = path.substr(device + sizeof deviceMark - 1);
    for (char& c : address) {
        if (c == '_')
            c = ':';
    }
    return adapter + "/" + address;
}

std::string argumentText(const BusSignal& signal) {
    if (signal.member == "PropertyChanged" && signal.arguments.size() == 2)
        return display(signal.arguments[0]) + " = " + display(signal.arguments[1]);
    return display(signal.arguments);
}

void printLine(const std::string& subject, const std::string& what, const std::string& arguments) {
    constexpr std::size_t subjectWidth = 22;
    constexpr std::size_t signalWidth = 25; // of AudioSink.PropertyChanged
    std::string signal = printable(what);
    if (!arguments.empty())
        signal = padded(signal, signalWidth) + "  ";
    std::cout << coloured(timeForPeople(), Colour::Dim) << "  "
              << padded(printable(subject), subjectWidth) << "  " << coloured(signal, Colour::Bold)
              << printable(arguments) << '\n';
    flushOutput();
}

void printDaemon(const Options& options, bool isThere) {
    if (options.json)
        printEvent(
            {{"event", isThere ? "daemon-came" : "daemon-gone"}, {"time", timeForPrograms()}});
    else
        printLine("bluetoothd", isThere ? "is on the bus" : "has left the bus", "");
}

void printSignal(const Options& options, const BusSignal& signal) {
    if (BusFeed::isDaemonChange(signal)) {
        printDaemon(options, !BusFeed::isDaemonGone(signal));
        return;
    }
    if (options.json)
        printEvent({{"event", "signal"},
                    {"time", timeForPrograms()},
                    {"path", signal.path},
                    {"interface", signal.interface},
                    {"member", signal.member},
                    {"arguments", signal.arguments}});
    else
        printLine(shortPath(signal.path),
                  signal.interface.substr(signal.interface.rfind('.') + 1) + "." + signal.member,
                  argumentText(signal));
}

void monitor(const Options& options) {
    Interrupt interrupt;
    BusFeed feed(BusFeed::Signals::All);
    openManager(); // without a daemon to watch the user has most likely mistaken something
    printDaemon(options, true);
    while (!interrupt.came()) {
        for (BusSignal signal; feed.next(signal);)
            printSignal(options, signal);
        waitForInput({feed.fd(), interrupt.fd()});
    }
}

} // namespace

const Verb monitorVerb = {"monitor",
                          "General",
                          "Show every signal of bluetoothd as it comes, until Ctrl-C",
                          "kesbt monitor\nkesbt monitor --json",
                          {{Limit::Stream, noArguments(monitor)}}};

} // namespace Kesbt
