#pragma once

#include "bus/call.h"
#include "world/timer.h"

#include <functional>
#include <list>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// The calls that shall fail or wait when they come next, each once.
class Faults {
public:
    using Dispatch = std::function<void(const CallPtr&)>;

    explicit Faults(Dispatch dispatch) : dispatch_(std::move(dispatch)) {}

    void failNext(const std::string& interface, const std::string& member, BusError error);
    void delayNext(const std::string& interface, const std::string& member, guint milliseconds);
    void clear();

    /// @return whether the call was answered here, or waits
    bool take(const CallPtr& call);

private:
    struct Fault {
        std::string interface;
        std::string member;
        BusError error;
        guint delay;
    };
    struct Waiting {
        CallPtr call;
        Timer timer;
    };

    Dispatch dispatch_;
    std::vector<Fault> faults_;
    std::list<Waiting> waiting_;
};

} // namespace Bluetooth::Sim
