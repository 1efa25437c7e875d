// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVED_MANAGER_H
#define KESBLUETOOTH_SIM_DAEMON_SERVED_MANAGER_H

#include "serving.h"
#include "serving/bluez4/interfaces.h"

#include <string>

namespace Bluetooth::Sim {

class ServedAdapter;
class Bluetoothd;

/// org.bluez.Manager at "/".
class ServedManager {
public:
    explicit ServedManager(Bluetoothd& daemon);
    ServedManager(const ServedManager&) = delete;
    ServedManager& operator=(const ServedManager&) = delete;
    ~ServedManager();

    void adapterAdded(const ServedAdapter& adapter);
    void adapterRemoved(const ServedAdapter& adapter);

private:
    template <class Served>
    friend const Interface& Serving::managerInterface();

    void getProperties(const CallPtr& call);
    void defaultAdapter(const CallPtr& call);
    void findAdapter(const CallPtr& call);
    void listAdapters(const CallPtr& call);

    Value adapterPaths() const;
    void emit(const char* member, const Value& arguments);
    void adaptersChanged();
    void setDefault(const ServedAdapter& adapter);

    Bluetoothd& m_daemon;
    std::string m_default; ///< path of the default adapter, or ""
};

} // namespace Bluetooth::Sim

#endif
