#include "sim/sim_test.h"

namespace Bluetooth::Test {

namespace {

class SimPairingTest : public SimTest {
protected:
    void startPairing(const std::string& capability = "") {
        client->taken();
        client->start("pair", "Adapter.CreatePairedDevice",
                      "('00:11:22:33:44:55', objectpath '/agent', '" + capability + "')");
    }
    /// What comes between the new connection and the end of a pairing with this agent.
    Texts pair(const std::string& capability = "") {
        startPairing(capability);
        client->until("phone Connected=true");
        Texts came = client->until("agent Release");
        client->control("ClearFaults");
        return came;
    }
    void comeToPair() { client->control("StartIncomingPairing", onAdapter); }
    /// A pairing whose agent has been asked and stays silent.
    void startWaiting(const std::string& settings = "'Passkey': <uint32 7>") {
        add(settings);
        client->agentAnswers("RequestConfirmation", "-");
        startPairing();
        client->until("agent RequestConfirmation");
    }
    const Texts disconnected = lines("phone Connected=false") + removed;
};

TEST_F(SimPairingTest, SuccessComesInTheOrderOfTheDaemon) {
    add("'Name': <'Phone'>, 'Passkey': <uint32 42>, 'UUIDs': <['1101']>");
    startPairing();
    EXPECT_EQ(client->until("reply pair"),
              created + lines("phone Connected=true", "phone Name='Phone'", "phone Alias='Phone'",
                              "agent RequestConfirmation phone 42", "phone Paired=true",
                              "agent Release",
                              "phone UUIDs=['00001101-0000-1000-8000-00805f9b34fb']",
                              "reply pair phone"));
    startPairing();
    EXPECT_EQ(client->until("error pair"), lines("error pair AlreadyExists: Already Exists"));
}

TEST_F(SimPairingTest, ADeviceThatExistsIsOnlyPaired) {
    create("'Behaviour': <'JustWorks'>");
    startPairing();
    EXPECT_EQ(client->until("reply pair"),
              lines("phone Paired=true", "agent Release", "reply pair phone"));
}

TEST_F(SimPairingTest, TheTwoCapabilitiesDecideWhatTheAgentIsAsked) {
    client->agentAnswers("RequestPasskey", "(uint32 7,)");
    const std::string confirmation = "agent RequestConfirmation phone 7";
    const std::string passkey = "agent RequestPasskey phone";
    const std::string display = "agent DisplayPasskey phone 7 0x00";
    const std::string nothing = "phone Paired=true";
    const Texts ours{"", "DisplayOnly", "KeyboardOnly", "NoInputNoOutput", "KeyboardDisplay"};
    const std::vector<Texts> rows = {
        // theirs, and what follows for each of ours
        {"DisplayYesNo", confirmation, confirmation, passkey, nothing, confirmation},
        {"DisplayOnly", confirmation, confirmation, passkey, nothing, confirmation},
        {"KeyboardOnly", display, display, passkey, nothing, display},
        {"NoInputNoOutput", nothing, nothing, nothing, nothing, nothing}};
    for (const auto& row : rows) {
        for (std::size_t i = 0; i < ours.size(); ++i) {
            add("'Passkey': <uint32 7>, 'Capability': <'" + row[0] + "'>");
            const Texts came = pair(ours[i]);
            EXPECT_EQ(came.front(), row[i + 1]) << row[0] << " and " << ours[i];
            EXPECT_EQ(came[came.size() - 2], nothing);
            client->until("reply pair");
            client->control("DropLink", onAdapter);
            client->call("Adapter.RemoveDevice", byPath);
            client->control("RemoveDevice", byAddress);
        }
    }
    startPairing("Telepathy");
    EXPECT_EQ(client->until("error pair").back(), "error pair " + badArguments);
}

TEST_F(SimPairingTest, APasskeyIsShownWhileItIsTypedThere) {
    add("'Behaviour': <'DisplayPasskey'>, 'Passkey': <uint32 123456>");
    Texts expected;
    for (const char* typed : {"0", "1", "2", "3", "4", "5", "6"})
        expected.push_back(std::string("agent DisplayPasskey phone 123456 0x0") + typed);
    EXPECT_EQ(pair(), expected + lines("agent Cancel", "phone Paired=true", "agent Release"));
}

TEST_F(SimPairingTest, APinIsShownToAnAgentThatCanAndAskedOfOneThatCannot) {
    add("'Behaviour': <'DisplayPin'>, 'PIN': <'0000'>, 'Passkey': <uint32 42>");
    client->agentAnswers("DisplayPinCode", "!org.freedesktop.DBus.Error.UnknownMethod");
    client->agentAnswers("RequestPinCode", "('0000',)");
    EXPECT_EQ(pair(), lines("agent DisplayPinCode phone '000042'", "agent RequestPinCode phone",
                            "phone Paired=true", "agent Release"));
}

TEST_F(SimPairingTest, FailuresHaveTheErrorOfTheirCauseAndTakeTheDeviceBack) {
    setTimes("'PairingTimeout': <200>");
    const std::string confirm = "ConfirmPasskey'>";
    const std::string pin = "LegacyPin'>, 'PIN': <'1234'>";
    const char* const failed = "Failed: Authentication Failed";
    const char* const rejected = "Rejected: Authentication Rejected";
    const char* const refusal = "!org.bluez.Error.Rejected";
    const struct {
        std::string settings; ///< from the behaviour on
        std::string method;   ///< what the agent is asked
        const char* answer;
        std::string error;
    } failures[] = {
        {confirm, "RequestConfirmation", refusal, failed},
        {confirm, "RequestConfirmation", "!org.bluez.Error.Canceled", failed},
        {pin, "RequestPinCode", "('4321',)", failed},
        {"WrongPin'>", "RequestPinCode", "('0000',)", failed},
        {pin, "RequestPinCode", refusal, rejected},
        {pin, "RequestPinCode", "('',)", rejected},
        {pin, "RequestPinCode", "('12345678901234567',)", rejected},
        {pin, "RequestPinCode", "(uint32 1234,)", rejected},
        {"RefusesConfirmation'>", "RequestConfirmation", "", failed},
        {"CancelsPairing'>", "RequestConfirmation", "", "Canceled: Authentication Canceled"},
        {"NeverAnswers'>", "RequestConfirmation", "", "Timeout: Authentication Timeout"},
        {"Rejects'>", "", "", rejected}};
    for (const auto& failure : failures) {
        add("'Behaviour': <'" + failure.settings);
        client->agentAnswers(failure.method, failure.answer);
        startPairing();
        client->until(created[1]);
        Texts came = client->until("hci0 DeviceRemoved");
        if (!failure.method.empty()) {
            ASSERT_GT(came.size(), 1U);
            EXPECT_EQ(came[1].find("agent " + failure.method), 0U) << came[1];
            came.erase(came.begin() + 1);
        }
        EXPECT_EQ(came, lines("phone Connected=true", "error pair Authentication" + failure.error,
                              "agent Release") +
                            disconnected)
            << failure.settings << failure.answer;
        client->control("RemoveDevice", byAddress);
    }
    add("'Behaviour': <'RepeatedAttempts'>");
    startPairing();
    EXPECT_EQ(client->until("error pair").back(), "error pair RepeatedAttempts: Repeated Attempts");
    client->until("hci0 DeviceRemoved");
    client->control("RemoveDevice", byAddress);
    startPairing(); // and nobody there is a page timeout
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              created + lines("error pair ConnectionAttemptFailed: Page Timeout", "agent Release") +
                  removed);
}

TEST_F(SimPairingTest, SilenceTimesOutWithCancel) {
    setTimes("'PairingTimeout': <100>");
    startWaiting();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              lines("agent Cancel", "error pair AuthenticationTimeout: Authentication Timeout",
                    "agent Release") +
                  disconnected);
}

TEST_F(SimPairingTest, ALostLinkIsToldToAgentAndCaller) {
    startWaiting("'Behaviour': <'VanishesWhilePairing'>");
    EXPECT_EQ(client->until("agent Release"),
              lines("agent Cancel", "error pair ConnectionAttemptFailed: Connection Timeout",
                    "agent Release"));
}

TEST_F(SimPairingTest, CancellingByItsOwnerKeepsTheDaemonsOrder) {
    startWaiting();
    startPairing();
    EXPECT_EQ(client->until("error pair"), lines("error pair InProgress: In Progress"));
    EXPECT_EQ(client->call("Adapter.CreateDevice", byAddress),
              "error AlreadyExists: Already Exists");
    SimClient other;
    other.base();
    EXPECT_EQ(other.call("Adapter.CancelDeviceCreation", byAddress),
              "error NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(
        client->trace("Adapter.CancelDeviceCreation", byAddress, "error pair"),
        lines("phone DisconnectRequested", "reply call", "phone Connected=false", "agent Cancel") +
            removed + lines("agent Release", "error pair ConnectionAttemptFailed: Page Timeout"));
}

TEST_F(SimPairingTest, PowerOffCancels) {
    client->call("Adapter.StartDiscovery"); // suspended; it does not come back either
    startWaiting();
    EXPECT_EQ(set("Powered", "false"),
              lines("agent Cancel", "error pair AuthenticationCanceled: Authentication Canceled",
                    "agent Release") +
                  disconnected + lines("hci0 Pairable=false", "hci0 Powered=false", "reply set"));
}

TEST_F(SimPairingTest, ThePairingEndsWithItsClient) {
    add();
    auto other = std::make_unique<SimClient>();
    other->base();
    other->agentAnswers("RequestConfirmation", "-");
    other->start("pair", "Adapter.CreatePairedDevice",
                 "('00:11:22:33:44:55', objectpath '/agent', '')");
    other->until("agent RequestConfirmation");
    client->until("phone Connected=true");
    other.reset();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              lines("phone DisconnectRequested") + disconnected);
}

TEST_F(SimPairingTest, AnUnregisteredAgentNoLongerAnswers) {
    add();
    client->agentAnswers("RequestConfirmation", "-");
    registerAgent();
    comeToPair();
    client->until("agent RequestConfirmation");
    EXPECT_EQ(client->trace("Adapter.UnregisterAgent", "(objectpath '/agent',)"),
              lines("agent Cancel", "agent Release", "reply call"));
    EXPECT_EQ(client->until("hci0 DeviceRemoved"), disconnected);
}

TEST_F(SimPairingTest, IncomingPairingsAskTheRegisteredAgentAndJustWorkWithoutOne) {
    add("'Passkey': <uint32 7>, 'UUIDs': <['1101']>");
    comeToPair();
    client->until("phone UUIDs");
    client->control("DropLink", onAdapter);
    client->call("Adapter.RemoveDevice", byPath);
    registerAgent();
    client->taken();
    comeToPair();
    EXPECT_EQ(client->until("phone UUIDs"),
              created + lines("phone Connected=true", "agent RequestConfirmation phone 7",
                              "phone Paired=true",
                              "phone UUIDs=['00001101-0000-1000-8000-00805f9b34fb']"));
    set("Pairable", "false");
    add("", "00:11:22:33:44:66");
    client->control("StartIncomingPairing", "('hci0', '00:11:22:33:44:66')");
    client->until("hci0 DeviceRemoved 'hci0/dev_00_11_22_33_44_66'");
}

} // namespace

} // namespace Bluetooth::Test
