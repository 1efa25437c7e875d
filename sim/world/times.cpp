#include "world/times.h"

namespace Bluetooth::Sim {

const std::vector<Times::Key>& Times::keys() {
    static const std::vector<Key> table = {
        {"Inquiry", &Times::inquiry},
        {"InquiryGap", &Times::inquiryGap},
        {"FirstFound", &Times::firstFound},
        {"FoundInterval", &Times::foundInterval},
        {"NameRequest", &Times::nameRequest},
        {"Connect", &Times::connect},
        {"PageTimeout", &Times::pageTimeout},
        {"ServiceSearch", &Times::serviceSearch},
        {"ReverseSearch", &Times::reverseSearch},
        {"Pairing", &Times::pairing},
        {"KeyPress", &Times::keyPress},
        {"LinkLoss", &Times::linkLoss},
        {"IdleDisconnect", &Times::idleDisconnect},
        {"DisconnectRequest", &Times::disconnectRequest},
        {"AudioConnect", &Times::audioConnect},
        {"ControlConnect", &Times::controlConnect},
        {"PairingTimeout", &Times::pairingTimeout},
        {"AgentTimeout", &Times::agentTimeout},
    };
    return table;
}

} // namespace Bluetooth::Sim
