// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/refusal.h"
#include "show/output.h"
#include "show/text.h"
#include "verbs/list.h"

#include <bluetooth/dbus_object.h>

#include <iostream>

namespace Kesbt {

namespace {

void listNames(const Options& options) {
    Bluetooth::DBusObject bus;
    const std::unique_ptr<std::vector<std::string>> names(bus.listNames());
    if (!bus.getConnection())
        throw daemonAbsent();
    if (bus.hasError())
        throw refusal("cannot list the names on the system bus", bus.getErrorName(),
                      bus.getErrorMessage());
    if (options.json) {
        printDocument(*names);
        return;
    }
    for (const std::string& name : *names)
        std::cout << printable(name) << '\n';
}

} // namespace

const Verb namesVerb = {"names",
                        "General",
                        "List the names on the system bus",
                        "kesbt names\nkesbt names --json",
                        {{Limit::Whole, noArguments(listNames)}}};

} // namespace Kesbt
