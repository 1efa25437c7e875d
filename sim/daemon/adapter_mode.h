// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_ADAPTER_MODE_H
#define KESBLUETOOTH_SIM_DAEMON_ADAPTER_MODE_H

#include "serving.h"
#include "serving/bus/call.h"
#include "serving/bus/one_shot_timer.h"

#include <string>
#include <vector>

namespace Bluetooth::Sim {

class ServedAdapter;

/// Power, discoverability and pairability of one adapter, with their time-outs, and the sessions
/// by which clients ask for power.
class AdapterMode {
public:
    explicit AdapterMode(ServedAdapter& adapter);

    bool powered() const { return m_mode != Mode::Off; }
    bool discoverable() const { return m_mode == Mode::Discoverable; }
    bool pairable() const;
    guint32 deviceClass() const;

    void comeUp();
    void goDown();

    /// Each answers a SetProperty call of its name; the value has the right type.
    void setPowered(const CallPtr& call, const Value& value);
    void setDiscoverable(const CallPtr& call, const Value& value);
    void setPairable(const CallPtr& call, const Value& value);
    void setDiscoverableTimeout(const CallPtr& call, const Value& value);
    void setPairableTimeout(const CallPtr& call, const Value& value);

    void requestSession(const CallPtr& call);
    void releaseSession(const CallPtr& call);
    void clientGone(const std::string& client);

private:
    enum class Mode { Off, Connectable, Discoverable };

    Mode storedMode() const;
    void change(const CallPtr& call, Mode wanted);
    void changeTo(Mode wanted);
    void powerOn();
    void powerOff();
    void startDiscoverableTimeout();
    void startPairableTimeout();
    bool limited() const;
    void classMayChange();
    void sessionEnded();

    ServedAdapter& m_adapter;
    Mode m_mode = Mode::Off;
    Mode m_lastingMode = Mode::Off; ///< what it is without sessions
    bool m_limited = false;         ///< the class says that it is discoverable for a short time
    CallPtr m_asking;               ///< the RequestSession whose agent is asked
    CallPtr m_changing;             ///< what is answered when the change has been made
    OneShotTimer m_change;
    OneShotTimer m_discoverableTimer;
    OneShotTimer m_pairableTimer;
    std::vector<std::string> m_sessions; ///< owners, once for each session
};

} // namespace Bluetooth::Sim

#endif
