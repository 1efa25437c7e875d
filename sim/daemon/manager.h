#ifndef KESBLUETOOTH_SIM_DAEMON_MANAGER_H
#define KESBLUETOOTH_SIM_DAEMON_MANAGER_H

#include "serving.h"
#include "serving/bluez4/interfaces.h"

#include <string>

namespace Bluetooth::Sim {

class Adapter;
class Daemon;

/// org.bluez.Manager at "/".
class Manager {
public:
    explicit Manager(Daemon& daemon);
    Manager(const Manager&) = delete;
    Manager& operator=(const Manager&) = delete;
    ~Manager();

    void adapterAdded(const Adapter& adapter);
    void adapterRemoved(const std::string& path, bool wasDefault);

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

    Daemon& m_daemon;
};

} // namespace Bluetooth::Sim

#endif
