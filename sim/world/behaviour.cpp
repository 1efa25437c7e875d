#include "world/behaviour.h"

#include <algorithm>

namespace Bluetooth::Sim {

namespace {

template <Capability Value>
void capability(PeerDevice& peer) {
    peer.capability = Value;
}

template <PairingEnd Value>
void ends(PeerDevice& peer) {
    peer.pairingEnd = Value;
}

} // namespace

const std::vector<Behaviour>& behaviours() {
    static const std::vector<Behaviour> table = {
        {"JustWorks", "pairs without a question (NoInputNoOutput)",
         capability<Capability::NoInputNoOutput>},
        {"ConfirmPasskey", "both sides show a passkey, ours confirms it (DisplayYesNo)",
         capability<Capability::DisplayYesNo>},
        {"EnterPasskey", "shows a passkey that a KeyboardOnly agent enters (DisplayOnly)",
         capability<Capability::DisplayOnly>},
        {"DisplayPasskey", "a passkey that our side shows is typed on it (KeyboardOnly)",
         capability<Capability::KeyboardOnly>},
        {"LegacyPin", "asks for a PIN and compares it with PIN",
         [](PeerDevice& peer) { peer.legacy = true; }},
        {"WrongPin", "asks for a PIN and takes none",
         [](PeerDevice& peer) {
             peer.legacy = true;
             peer.pin.clear();
         }},
        {"DisplayPin", "a keyboard without passkeys: our side shows a PIN that is typed on it",
         [](PeerDevice& peer) {
             peer.legacy = true;
             peer.displaysPin = true;
         }},
        {"Rejects", "allows no pairing", ends<PairingEnd::Rejected>},
        {"RefusesConfirmation", "its user says no", ends<PairingEnd::Refused>},
        {"NeverAnswers", "falls silent while it pairs", ends<PairingEnd::NeverAnswers>},
        {"CancelsPairing", "its user stops the pairing", ends<PairingEnd::CancelledByPeer>},
        {"RepeatedAttempts", "wants fewer attempts", ends<PairingEnd::RepeatedAttempts>},
        {"VanishesWhilePairing", "its link is lost while the agent is asked",
         ends<PairingEnd::LinkLost>},
        {"Slow", "takes 28 seconds to pair", [](PeerDevice& peer) { peer.pairingTime = 28000; }},
        {"Unconnectable", "is found, but cannot be reached",
         [](PeerDevice& peer) { peer.connectable = false; }},
        {"Vanishing", "goes out of range 5 seconds after a discovery began",
         [](PeerDevice& peer) { peer.visibleFor = 5000; }},
        {"Known", "was created before", [](PeerDevice& peer) { peer.known = true; }},
        {"AlreadyPaired", "was paired before",
         [](PeerDevice& peer) {
             peer.known = true;
             peer.paired = true;
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
