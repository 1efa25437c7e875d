// SPDX-License-Identifier: LGPL-2.1-or-later
#include "core/match_rule.h"

#include "core/bus_driver.h"

namespace Bluetooth {

std::string signalRule(const std::string& interface, const std::string& member,
                       const std::string& path) {
    return "type='signal',interface='" + interface + "',member='" + member + "',path='" + path +
           "'";
}

bool addMatch(BusLink* link, const std::string& rule, ScopedError& error) {
    return callBusDriver(link, "AddMatch", rule, error) != nullptr;
}

bool removeMatch(BusLink* link, const std::string& rule, ScopedError& error) {
    return callBusDriver(link, "RemoveMatch", rule, error) != nullptr;
}

} // namespace Bluetooth
