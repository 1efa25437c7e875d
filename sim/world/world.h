// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_WORLD_WORLD_H
#define KESBLUETOOTH_SIM_WORLD_WORLD_H

#include "world/peer_device.h"
#include "world/times.h"

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// What the daemon's storage holds of one device; it outlives the daemon.
struct StoredDevice {
    bool known = false; ///< it was created, and not removed since
    bool paired = false;
    bool trusted = false;
    bool blocked = false;
    std::string name;
    std::string alias;
    std::optional<guint32> deviceClass; ///< known once the device was seen in a discovery
    std::vector<std::string> uuids;
    std::optional<guint16> vendor;
    std::optional<guint16> product;
    std::optional<guint16> version;
};

/// One controller with the settings and devices that are stored for it.
struct AdapterHardware {
    unsigned index = 0;
    std::string address;
    std::string name;
    guint32 deviceClass = 0x6e0100;
    bool powered = true;
    bool discoverable = false;
    bool pairable = true;
    guint32 discoverableTimeout = 0;
    guint32 pairableTimeout = 0;
    /// The classes of its own service records: those of the daemon as it is shipped.
    std::vector<std::string> uuids{
        "00001112-0000-1000-8000-00805f9b34fb", "0000111f-0000-1000-8000-00805f9b34fb",
        "0000110c-0000-1000-8000-00805f9b34fb", "0000110e-0000-1000-8000-00805f9b34fb"};
    std::map<std::string, StoredDevice> storage; ///< by address

    std::string id() const { return "hci" + std::to_string(index); }
};

/// The host's audio.conf, as it is shipped.
struct AudioConfiguration {
    bool source = false;   ///< whether devices are served as org.bluez.AudioSource
    bool gateway = false;  ///< whether they are served as org.bluez.HandsfreeGateway
    bool scoByPcm = false; ///< whether a headset's sound goes past the host
};

/// Everything that exists apart from the daemon: controllers, devices in the air, and how long
/// things take. A daemon that restarts finds it as it was.
struct World {
    Times times;
    AudioConfiguration audio;
    std::vector<std::shared_ptr<AdapterHardware>> adapters;
    std::vector<std::shared_ptr<PeerDevice>> peers;

    std::shared_ptr<AdapterHardware> adapter(const std::string& id) const;
    std::shared_ptr<PeerDevice> peer(const std::string& address) const;
    /// The lowest index that no adapter has.
    unsigned freeIndex() const;
    /// Stores what an adapter shall know of a device from the start.
    static void store(AdapterHardware& adapter, const PeerDevice& peer);
};

} // namespace Bluetooth::Sim

#endif
