// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVICE_SEARCH_H
#define KESBLUETOOTH_SIM_DAEMON_SERVICE_SEARCH_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// One DiscoverServices call.
class ServiceSearch {
public:
    /// @return the search, or null when the call was answered at once
    static std::shared_ptr<ServiceSearch> begin(ServedDevice& device, const CallPtr& call);

    ServiceSearch(ServedDevice& device, const CallPtr& call, std::string uuid)
        : m_device(device), m_call(call), m_uuid(std::move(uuid)) {}

    std::string owner() const { return m_call->sender(); }
    /// The caller is told "Operation canceled".
    void cancel();
    void linkLost();
    void ownerGone() { end(); }
    /// Stops without a word; the device has gone.
    void abandon();

private:
    void run();
    void finish();
    void end();

    ServedDevice& m_device;
    CallPtr m_call;
    std::string m_uuid; ///< what is looked for; "" for everything
    Link::Hold m_hold;
    OneShotTimer m_timer;
};

} // namespace Bluetooth::Sim

#endif
