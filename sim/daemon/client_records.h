// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_CLIENT_RECORDS_H
#define KESBLUETOOTH_SIM_DAEMON_CLIENT_RECORDS_H

#include "serving.h"
#include "serving/bluez4/service_interfaces.h"

#include <set>
#include <string>

namespace Bluetooth::Sim {

class Bluetoothd;
class ServedAdapter;
class ServedDevice;

/// org.bluez.Service: the service records that clients add to one adapter or to all of them, and
/// the authorizations that they ask for.
class ClientRecords {
public:
    /// @param adapter  null for all adapters
    ClientRecords(Bluetoothd& daemon, ServedAdapter* adapter);
    ClientRecords(const ClientRecords&) = delete;
    ClientRecords& operator=(const ClientRecords&) = delete;

    void clientGone(const std::string& client);

private:
    template <class Served>
    friend const Interface& Serving::serviceInterface();

    void addRecord(const CallPtr& call);
    void updateRecord(const CallPtr& call);
    void removeRecord(const CallPtr& call);
    void requestAuthorization(const CallPtr& call);
    void cancelAuthorization(const CallPtr& call);

    std::string adapterId() const;
    bool owns(const CallPtr& call, guint32 handle) const;
    bool ask(const std::string& address, const std::string& uuid);
    void answered(bool allowed);

    Bluetoothd& m_daemon;
    ServedAdapter* m_adapter;
    std::set<guint32> m_handles;
    CallPtr m_waiting; ///< RequestAuthorization while an agent is asked
};

} // namespace Bluetooth::Sim

#endif
