// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVICE_SEARCH_H
#define KESBLUETOOTH_SIM_DAEMON_SERVICE_SEARCH_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"

#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// One search for a device's services, by which CreateDevice, CreatePairedDevice and
/// DiscoverServices are answered, or which the daemon makes for itself.
class ServiceSearch {
public:
    /// @param call  what is answered at the end; null when the daemon wants to know by itself
    /// @param uuid  what is looked for; "" for everything
    ServiceSearch(ServedDevice& device, CallPtr call, std::string uuid = "");

    /// The unique name of the client that wants it; "" for the daemon's own.
    std::string owner() const { return m_call ? m_call->sender() : ""; }
    /// Whether a device is being made by it.
    bool isCreating() const { return m_kind == Kind::Create || m_kind == Kind::CreatePaired; }
    bool isDiscovering() const { return m_kind == Kind::Discover; }
    void begin();
    /// The caller is told "Operation canceled".
    void cancel();
    void notReached();
    void linkLost();
    void ownerGone();
    /// Stops without a word; the device has gone.
    void abandon();

private:
    enum class Kind { Own, Create, CreatePaired, Discover };

    static Kind kindOf(const CallPtr& call);
    void run();
    void finish();
    void end();

    ServedDevice& m_device;
    CallPtr m_call;
    Kind m_kind;
    std::string m_uuid;
    Link::Hold m_hold;
    OneShotTimer m_timer;
};

} // namespace Bluetooth::Sim

#endif
