// SPDX-License-Identifier: LGPL-2.1-or-later
#include "world/behaviour.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

/// One setting.
template <class T, class U>
std::function<void(PeerDevice&)> with(T PeerDevice::*setting, U value) {
    return [setting, value](PeerDevice& device) { device.*setting = value; };
}

/// The pairing ends in this way, whatever the agent answers.
std::function<void(PeerDevice&)> ends(PairingEnd::Since since, BluezError error,
                                      guint Times::*after = nullptr) {
    return with(&PeerDevice::pairingEnd, PairingEnd{since, error, after});
}

} // namespace

const std::vector<Behaviour>& behaviours() {
    using Since = PairingEnd::Since;
    static const std::vector<Behaviour> table = {
        {"JustWorks", "pairs without a question (NoInputNoOutput)",
         with(&PeerDevice::capability, Capability::NoInputNoOutput)},
        {"ConfirmPasskey", "both sides show a passkey, ours confirms it (DisplayYesNo)",
         with(&PeerDevice::capability, Capability::DisplayYesNo)},
        {"EnterPasskey", "shows a passkey that a KeyboardOnly agent enters (DisplayOnly)",
         with(&PeerDevice::capability, Capability::DisplayOnly)},
        {"DisplayPasskey", "a passkey that our side shows is typed on it (KeyboardOnly)",
         with(&PeerDevice::capability, Capability::KeyboardOnly)},
        {"LegacyPin", "asks for a PIN and compares it with PIN", with(&PeerDevice::legacy, true)},
        {"WrongPin", "asks for a PIN and takes none",
         [](PeerDevice& device) {
             device.legacy = true;
             device.pin.clear();
         }},
        {"DisplayPin", "a keyboard without passkeys: our side shows a PIN that is typed on it",
         [](PeerDevice& device) {
             device.legacy = true;
             device.displaysPin = true;
         }},
        {"Rejects", "allows no pairing", ends(Since::Begun, Errors::authenticationRejected)},
        {"RefusesConfirmation", "its user says no",
         ends(Since::Answered, Errors::authenticationFailed)},
        {"NeverAnswers", "falls silent while it pairs",
         ends(Since::Answered, Errors::authenticationTimeout, &Times::pairingTimeout)},
        {"CancelsPairing", "its user stops the pairing",
         ends(Since::Answered, Errors::authenticationCanceled)},
        {"RepeatedAttempts", "wants fewer attempts", ends(Since::Begun, Errors::repeatedAttempts)},
        {"VanishesWhilePairing", "its link is lost while the agent is asked",
         ends(Since::Asked, Errors::connectionAttemptFailed("Page Timeout"), &Times::linkLoss)},
        {"Slow", "takes 28 seconds to pair", with(&PeerDevice::pairingTime, 28000U)},
        {"Unconnectable", "is found, but cannot be reached", with(&PeerDevice::connectable, false)},
        {"Vanishing", "goes out of range 5 seconds after a discovery began",
         with(&PeerDevice::visibleFor, 5000U)},
        {"NoEndpoint", "has no endpoint for audio streams",
         with(&PeerDevice::audioEndpoint, false)},
        {"AudioHangs", "falls silent while audio is connected, for 41 seconds",
         with(&PeerDevice::audioHangs, true)},
        {"Known", "was created before", with(&PeerDevice::known, true)},
        {"AlreadyPaired", "was paired before",
         [](PeerDevice& device) {
             device.known = true;
             device.paired = true;
         }},
    };
    return table;
}

const Behaviour* findBehaviour(const std::string& name) {
    const auto& all = behaviours();
    const auto found = std::find_if(
        all.begin(), all.end(), [&](const Behaviour& behaviour) { return name == behaviour.name; });
    return found == all.end() ? nullptr : &*found;
}

} // namespace Bluetooth::Sim
