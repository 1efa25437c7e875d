// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_CONTROL_FAULTS_H
#define KESBLUETOOTH_SIM_CONTROL_FAULTS_H

#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"

#include <functional>
#include <list>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// The calls that shall fail or wait when they come next, each once.
class Faults {
public:
    using Dispatch = std::function<void(const CallPtr&)>;

    explicit Faults(Dispatch dispatch) : m_dispatch(std::move(dispatch)) {}

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
        OneShotTimer timer;
    };

    Dispatch m_dispatch;
    std::vector<Fault> m_faults;
    std::list<Waiting> m_waiting;
};

} // namespace Bluetooth::Sim

#endif
