// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SIM_WORLD_TIMES_H
#define KESBLUETOOTH_SIM_WORLD_TIMES_H

#include <glib.h>

namespace Bluetooth::Sim {

/// How long things take, in milliseconds. All but the two last are multiplied by `scale`.
struct Times {
    double scale = 1.0;

    guint inquiry = 10240;          ///< one round of a discovery
    guint inquiryGap = 60;          ///< between the end of a round and Discovering=false
    guint firstFound = 100;         ///< from the start of a round to its first device
    guint foundInterval = 150;      ///< between the devices of a round
    guint nameRequest = 400;        ///< to ask one device for its name after a round
    guint connect = 600;            ///< to reach a device that answers
    guint pageTimeout = 5120;       ///< until a device that does not answer is given up
    guint serviceSearch = 500;      ///< to read a device's service records
    guint reverseSearch = 2000;     ///< from a device's own connection to our search
    guint pairing = 800;            ///< from the last answer to the end of a pairing
    guint keyPress = 300;           ///< between two keys that are typed on a device
    guint modeChange = 50;          ///< to turn an adapter on, or to make it discoverable or not
    guint linkLoss = 5000;          ///< until the loss of a link is noticed
    guint idleDisconnect = 4000;    ///< until an unused link drops
    guint disconnectRequest = 2000; ///< from DisconnectRequested to the end of the link
    guint channelConnect = 200;     ///< to open a channel to a service other than audio
    guint audioConnect = 700;       ///< to set up an audio stream
    guint audioTimeout = 41000;     ///< until a device that falls silent meanwhile is given up
    guint audioRetry = 2000;        ///< from a stream's failure to the answer of its Connect
    guint audioPause = 1000;        ///< between two profiles that are connected together
    guint audioShutdown = 50;       ///< to close a stream
    guint audioClose = 1000;        ///< from a closed stream to the end of its profile
    guint audioIdle = 2000;         ///< from the end of the last profile to that of the link
    guint audioIdleAtPeer = 3000;   ///< the same when the device has closed it
    guint controlConnect = 2000;    ///< from a device's own stream to the remote control

    guint pairingTimeout = 30000; ///< until a pairing whose agent does not answer is given up
    guint agentTimeout = 60000;   ///< until any other request to an agent is given up

    guint scaledSeconds(guint32 seconds) const {
        const double milliseconds = 1000.0 * static_cast<double>(seconds) * scale;
        return milliseconds < G_MAXUINT ? static_cast<guint>(milliseconds) : G_MAXUINT;
    }
    guint scaled(guint milliseconds) const {
        return static_cast<guint>(static_cast<double>(milliseconds) * scale);
    }
    /// How long one of these takes.
    guint lasting(guint Times::*time) const {
        const bool waitsForClient = time == &Times::pairingTimeout || time == &Times::agentTimeout;
        return waitsForClient ? this->*time : scaled(this->*time);
    }
};

} // namespace Bluetooth::Sim

#endif
