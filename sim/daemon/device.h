#pragma once

#include "bus/interface.h"
#include "daemon/link.h"
#include "world/world.h"

#include <memory>
#include <string>

namespace Bluetooth::Sim {

class Adapter;
class AudioDevice;
class DeviceCreation;
class Pairing;
class ServiceSearch;

/// org.bluez.Device: a device that the daemon knows.
class Device : public std::enable_shared_from_this<Device> {
public:
    Device(Adapter& adapter, std::string address);
    Device(const Device&) = delete;
    Device& operator=(const Device&) = delete;
    ~Device();

    Adapter& adapter() const { return adapter_; }
    const std::string& address() const { return address_; }
    const std::string& path() const { return path_; }
    StoredDevice& stored() const { return stored_; }
    Link& link() { return link_; }
    /// The device in the air, or null when there is none any more.
    std::shared_ptr<Peer> peer() const;
    bool reachable() const;

    /// Whether the object goes when its link does: nothing is stored of it yet.
    bool temporary() const { return temporary_; }
    void setTemporary(bool temporary) { temporary_ = temporary; }
    /// Whether it is being created, paired or searched.
    bool busy() const;

    /// Each begins one kind of work; the caller has checked that none of that kind is under way.
    void create(const CallPtr& call);
    void pair(const CallPtr& call);
    /// The device connects to us, and pairs when asked to.
    void comeIn(bool pairing);
    Pairing* pairing() const { return pairing_.get(); }
    DeviceCreation* creation() const { return creation_.get(); }
    AudioDevice& audio() const { return *audio_; }
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
    static const Interface& table();

    void getProperties(const CallPtr& call);
    void setProperty(const CallPtr& call);
    void discoverServices(const CallPtr& call);
    void cancelDiscovery(const CallPtr& call);
    void disconnect(const CallPtr& call);

    std::string alias() const;
    void setAlias(const CallPtr& call, const Value& value);
    void setTrusted(const CallPtr& call, const Value& value);
    void setBlocked(const CallPtr& call, const Value& value);

    Adapter& adapter_;
    std::string address_;
    std::string path_;
    StoredDevice& stored_;
    bool temporary_ = true;
    bool classKnown_ = false;
    bool retired_ = false;
    std::string name_;
    Link link_;
    Timer reverseSearch_;
    std::shared_ptr<DeviceCreation> creation_;
    std::shared_ptr<Pairing> pairing_;
    std::shared_ptr<ServiceSearch> search_;
    std::unique_ptr<AudioDevice> audio_;
};

} // namespace Bluetooth::Sim
