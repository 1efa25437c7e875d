// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_WORLD_PEER_DEVICE_H
#define KESBLUETOOTH_SIM_WORLD_PEER_DEVICE_H

#include "serving.h"
#include "serving/bluez4/capability.h"
#include "serving/bluez4/errors.h"
#include "world/times.h"

#include <glib.h>

#include <optional>
#include <string>
#include <vector>

namespace Bluetooth::Sim {

/// How a pairing with a device ends, whatever the agent answers.
struct PairingEnd {
    enum class Since {
        Begun,   ///< the agent is not asked at all
        Asked,   ///< the link is lost while the agent is asked
        Answered ///< the agent is asked first
    };
    Since since;
    BluezError error;
    guint Times::*after = nullptr; ///< how long it takes, when not as long as any pairing
};

/// A device in the air: what it is, not what a daemon knows of it.
struct PeerDevice {
    std::string address; ///< upper case
    std::string name;
    std::string adapter; ///< "hci0" when only that adapter can see it, "" for all
    guint32 deviceClass = 0;
    gint16 rssi = -60;
    guint rssiVariation = 0; ///< most that the RSSI differs from `rssi` from round to round
    std::vector<std::string> uuids;
    std::optional<guint16> vendor;
    std::optional<guint16> product;
    std::optional<guint16> version;

    bool present = true;
    bool connectable = true;
    bool nameInInquiry = true; ///< whether the name comes with the first DeviceFound
    bool lowEnergy = false;
    bool broadcaster = false;
    bool connectsBack = false;        ///< opens a channel of its own while we connect audio
    bool audioEndpoint = true;        ///< whether streams find an endpoint on it
    bool audioHangs = false;          ///< falls silent while we connect audio
    bool documentedNetwork = false;   ///< Network.Connect does as its document says
    std::vector<std::string> refuses; ///< the services that do not listen
    guint visibleFor = 0;             ///< vanishes so long after a discovery began; 0: never

    bool legacy = false;
    bool displaysPin = false; ///< a legacy keyboard: we choose the PIN and show it
    Capability capability = Capability::DisplayYesNo;
    std::optional<PairingEnd> pairingEnd; ///< not set: well, when the agent's answer is right
    std::string pin = "0000";
    std::optional<guint32> passkey; ///< random when not set
    std::optional<guint> pairingTime;

    // What an adapter's daemon has stored of it when it first starts.
    bool known = false;
    bool paired = false;
    bool trusted = false;
    bool blocked = false;
    std::string alias;
};

} // namespace Bluetooth::Sim

#endif
