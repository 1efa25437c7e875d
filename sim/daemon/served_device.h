// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVED_DEVICE_H
#define KESBLUETOOTH_SIM_DAEMON_SERVED_DEVICE_H

#include "daemon/link.h"
#include "serving.h"
#include "serving/bluez4/interfaces.h"
#include "world/world.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class ServedAdapter;
class DeviceAudio;
class DeviceCreation;
class DevicePairing;
class ServiceSearch;

/// org.bluez.Device: a device that the daemon knows.
class ServedDevice : public std::enable_shared_from_this<ServedDevice> {
public:
    ServedDevice(ServedAdapter& adapter, std::string address);
    ServedDevice(const ServedDevice&) = delete;
    ServedDevice& operator=(const ServedDevice&) = delete;
    ~ServedDevice();

    ServedAdapter& adapter() const { return m_adapter; }
    const std::string& address() const { return m_address; }
    const std::string& path() const { return m_path; }
    StoredDevice& stored() const { return m_stored; }
    Link& link() { return m_link; }
    /// The device in the air, or null when there is none any more.
    std::shared_ptr<PeerDevice> peer() const;
    bool reachable() const;

    /// Whether the object goes when its link does: nothing is stored of it yet.
    bool temporary() const { return m_temporary; }
    void setTemporary(bool temporary) { m_temporary = temporary; }
    /// Whether it is being created, paired or searched.
    bool busy() const;

    /// Each begins one kind of work; the caller has checked that none of that kind is under way.
    void create(const CallPtr& call);
    void pair(const CallPtr& call);
    /// The device connects to us, and pairs when asked to.
    void comeIn(bool pairing);
    DevicePairing* pairing() const { return m_pairing.get(); }
    DeviceCreation* creation() const { return m_creation.get(); }
    DeviceAudio& audio() const { return *m_audio; }
    /// Each is called when the work has ended, by the work itself.
    void creationEnded();
    void pairingEnded();
    void searchEnded();

    /// The device was seen in a discovery: its class, and maybe its name, are known.
    void seen();
    void learnName();
    /// Its service records were read.
    void learnServices();
    void setPaired(bool paired);
    /// The link has gone.
    void linkLost();
    void clientGone(const std::string& client);
    /// Takes the object off the bus and ends all that runs; nothing is emitted any more.
    void retire();

    void emit(const char* member, const Value& arguments);
    void changed(const char* property, const Value& value);

private:
    template <class Served>
    friend const Interface& Serving::deviceInterface();

    void getProperties(const CallPtr& call);
    void setProperty(const CallPtr& call);
    void discoverServices(const CallPtr& call);
    void cancelDiscovery(const CallPtr& call);
    void disconnect(const CallPtr& call);

    std::string alias() const;
    void setAlias(const CallPtr& call, const Value& value);
    void setTrusted(const CallPtr& call, const Value& value);
    void setBlocked(const CallPtr& call, const Value& value);

    ServedAdapter& m_adapter;
    std::string m_address;
    std::string m_path;
    StoredDevice& m_stored;
    bool m_temporary = true;
    bool m_classKnown = false;
    bool m_retired = false;
    std::string m_name;
    Link m_link;
    OneShotTimer m_reverseSearch;
    std::shared_ptr<DeviceCreation> m_creation;
    std::shared_ptr<DevicePairing> m_pairing;
    std::shared_ptr<ServiceSearch> m_search;
    std::unique_ptr<DeviceAudio> m_audio;
};

} // namespace Bluetooth::Sim

#endif
