// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_DAEMON_SERVED_ADAPTER_H
#define KESBLUETOOTH_SIM_DAEMON_SERVED_ADAPTER_H

#include "daemon/adapter_discovery.h"
#include "daemon/adapter_mode.h"
#include "serving.h"
#include "serving/bluez4/interfaces.h"
#include "world/world.h"

#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

class AdapterMedia;
class AdapterServices;
class ClientAgent;
class Bluetoothd;
class ServedDevice;

/// org.bluez.Adapter: one controller with the devices that the daemon knows on it.
class ServedAdapter {
public:
    ServedAdapter(Bluetoothd& daemon, std::shared_ptr<AdapterHardware> hardware);
    ServedAdapter(const ServedAdapter&) = delete;
    ServedAdapter& operator=(const ServedAdapter&) = delete;
    ~ServedAdapter();

    Bluetoothd& daemon() const { return m_daemon; }
    AdapterHardware& hardware() const { return *m_hardware; }
    const std::string& path() const { return m_path; }
    AdapterMode& mode() { return m_mode; }
    AdapterDiscovery& discovery() { return m_discovery; }
    AdapterMedia& media() { return *m_media; }
    AdapterServices& services() const { return *m_services; }
    /// The agent that RegisterAgent gave, or null.
    ClientAgent* agent() const { return m_agent.get(); }
    std::shared_ptr<ClientAgent> sharedAgent() const { return m_agent; }
    /// The agent of the pairing under way, else the registered one, or null.
    const ClientAgent* currentAgent() const;

    /// What is said of the stored devices before the adapter itself is announced.
    void announce();
    /// What is said once the adapter is up.
    void comeUp();
    /// What is said before the adapter goes; also ends all that runs on it.
    void goDown();
    /// Ends what runs over the air when the power goes.
    void loseDevices();
    void clientGone(const std::string& client);
    void releaseAgents();

    /// The device in the air at that address that this adapter can reach or see, or null.
    std::shared_ptr<PeerDevice> peerAt(const std::string& address) const;
    std::shared_ptr<ServedDevice> find(const std::string& address) const;
    /// Makes the object of a device and announces it.
    std::shared_ptr<ServedDevice> addDevice(const std::string& address);
    /// Takes a device off the bus and out of storage, and announces that.
    void forgetDevice(const std::shared_ptr<ServedDevice>& device);

    /// The device has said of what class it is.
    void learnClass(const PeerDevice& peer);

    void emit(const char* member, const Value& arguments);
    void changed(const char* property, const Value& value);
    void uuidsChanged();

private:
    template <class Served>
    friend const Interface& Serving::adapterInterface();

    void getProperties(const CallPtr& call);
    void setProperty(const CallPtr& call);
    void requestSession(const CallPtr& call);
    void releaseSession(const CallPtr& call);
    void startDiscovery(const CallPtr& call);
    void stopDiscovery(const CallPtr& call);
    void listDevices(const CallPtr& call);
    void createDevice(const CallPtr& call);
    void createPairedDevice(const CallPtr& call);
    void cancelDeviceCreation(const CallPtr& call);
    void removeDevice(const CallPtr& call);
    void findDevice(const CallPtr& call);
    void registerAgent(const CallPtr& call);
    void unregisterAgent(const CallPtr& call);

    void setName(const CallPtr& call, const Value& value);
    void devicesChanged();
    Value devicePaths() const;
    Value uuids() const;

    Bluetoothd& m_daemon;
    std::shared_ptr<AdapterHardware> m_hardware;
    std::string m_path;
    AdapterMode m_mode;
    AdapterDiscovery m_discovery;
    std::unique_ptr<AdapterServices> m_services;
    std::shared_ptr<ClientAgent> m_agent;
    std::unique_ptr<AdapterMedia> m_media;
    std::vector<std::shared_ptr<ServedDevice>> m_devices;
};

} // namespace Bluetooth::Sim

#endif
