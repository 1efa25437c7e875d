// SPDX-License-Identifier: LGPL-2.1-or-later
#include "control/faults.h"

#include <algorithm>

namespace Bluetooth::Sim {

void Faults::failNext(const std::string& interface, const std::string& member, BusError error) {
    m_faults.push_back({interface, member, std::move(error), 0});
}

void Faults::delayNext(const std::string& interface, const std::string& member,
                       guint milliseconds) {
    m_faults.push_back({interface, member, {}, milliseconds});
}

void Faults::clear() {
    m_faults.clear();
}

bool Faults::take(const CallPtr& call) {
    const auto found = std::find_if(m_faults.begin(), m_faults.end(), [&](const Fault& fault) {
        return fault.interface == call->interface() && fault.member == call->member();
    });
    if (found == m_faults.end())
        return false;
    const Fault fault = *found;
    m_faults.erase(found);
    if (!fault.error.name.empty()) {
        call->fail(fault.error);
        return true;
    }
    m_waiting.emplace_back();
    const auto entry = std::prev(m_waiting.end());
    entry->call = call;
    entry->timer.start(fault.delay, [this, entry] {
        const CallPtr delayed = entry->call;
        m_waiting.erase(entry);
        m_dispatch(delayed);
    });
    return true;
}

} // namespace Bluetooth::Sim
