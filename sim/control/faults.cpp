#include "control/faults.h"

#include <algorithm>

namespace Bluetooth::Sim {

void Faults::failNext(const std::string& interface, const std::string& member, BusError error) {
    faults_.push_back({interface, member, std::move(error), 0});
}

void Faults::delayNext(const std::string& interface, const std::string& member,
                       guint milliseconds) {
    faults_.push_back({interface, member, {}, milliseconds});
}

void Faults::clear() {
    faults_.clear();
}

bool Faults::take(const CallPtr& call) {
    const auto found = std::find_if(faults_.begin(), faults_.end(), [&](const Fault& fault) {
        return fault.interface == call->interface() && fault.member == call->member();
    });
    if (found == faults_.end())
        return false;
    const Fault fault = *found;
    faults_.erase(found);
    if (!fault.error.name.empty()) {
        call->fail(fault.error);
        return true;
    }
    waiting_.emplace_back();
    const auto entry = std::prev(waiting_.end());
    entry->call = call;
    entry->timer.start(fault.delay, [this, entry] {
        const CallPtr delayed = entry->call;
        waiting_.erase(entry);
        dispatch_(delayed);
    });
    return true;
}

} // namespace Bluetooth::Sim
