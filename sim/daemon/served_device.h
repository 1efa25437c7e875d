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
class DevicePairing;
class DeviceServices;
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
    /// Whether it is known to have a service class, in any form of its UUID.
    bool offers(const std::string& uuid) const;

    /// Whether the object goes when its link does: nothing is stored of it yet.
    bool temporary() const { return m_temporary; }
    void setTemporary(bool temporary) { m_temporary = temporary; }
    /// It stays from now on, and is stored.
    void keep();
    /// Whether its services are being searched.
    bool busy() const { return m_search != nullptr; }

    /// Each begins one kind of work; the caller has checked that none of that kind is under way.
    void create(const CallPtr& call);
    void pair(const CallPtr& call);
    /// The device connects to us, and pairs when asked to.
    void comeIn(bool pairing);
    DevicePairing* pairing() const { return m_pairing.get(); }
    ServiceSearch* search() const { return m_search.get(); }
    DeviceAudio& audio() const { return *m_audio; }
    DeviceServices& services() const { return *m_services; }
    /// Each is called when the work has ended, by the work itself.
    void pairingEnded();
    void searchEnded();
    /// It has been paired: its services are searched, and the call is answered after that.
    /// @param call  null when the device began the pairing
    void pairingSucceeded(const CallPtr& call);
    /// Ends the search under way, which is wanted no longer.
    void cancelSearch();

    /// Says what was stored of it before its object was made.
    void announceStored();
    void learnName();
    /// Its service records were read.
    /// @param uuid  what was looked for; "" for everything
    /// @return the records that have it, as an a{us} of handles and XML
    Value learnServices(const std::string& uuid);
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
    void startSearch(const CallPtr& call, const std::string& uuid = "");
    void startReverseSearch();
    void learnId(const PeerDevice& peer);
    void setAlias(const CallPtr& call, const Value& value);
    void setTrusted(const CallPtr& call, const Value& value);
    void setBlocked(const CallPtr& call, const Value& value);

    ServedAdapter& m_adapter;
    std::string m_address;
    std::string m_path;
    StoredDevice& m_stored;
    bool m_temporary = true;
    bool m_retired = false;
    std::string m_name;
    Link m_link;
    OneShotTimer m_reverseSearch;
    std::shared_ptr<DevicePairing> m_pairing;
    std::shared_ptr<ServiceSearch> m_search;
    std::unique_ptr<DeviceAudio> m_audio;
    std::unique_ptr<DeviceServices> m_services;
};

} // namespace Bluetooth::Sim

#endif
