// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_DEVICE_CREATION_H
#define KESBLUETOOTH_SIM_DAEMON_DEVICE_CREATION_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"

#include <string>

namespace Bluetooth::Sim {

class ServedDevice;

/// One CreateDevice call, from the new object to the reply.
class DeviceCreation {
public:
    DeviceCreation(ServedDevice& device, const CallPtr& call) : m_device(device), m_call(call) {}

    std::string owner() const { return m_call->sender(); }
    void begin();
    /// CancelDeviceCreation: the device goes, then the caller of CreateDevice is told, then of
    /// this.
    void cancel(const CallPtr& call);
    void linkLost();
    void ownerGone();
    void powerLost() { linkLost(); }
    /// Stops without a word; the device has gone.
    void abandon();

private:
    void search();
    void succeed();
    void fail(const char* text);
    void removeDevice();

    ServedDevice& m_device;
    CallPtr m_call;
    Link::Hold m_hold;
    OneShotTimer m_timer;
};

} // namespace Bluetooth::Sim

#endif
