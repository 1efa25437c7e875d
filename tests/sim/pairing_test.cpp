#include "sim/sim_fixture.h"

#include <algorithm>

namespace Bluetooth::Test {

namespace {

class PairingTest : public SimTest {
protected:
    const std::string device = "dev_00_11_22_33_44_55 ";
    const std::string path = "'hci0/dev_00_11_22_33_44_55'";

    void startPairing(const std::string& capability = "") {
        client->taken();
        client->start("pair", adapter, "Adapter.CreatePairedDevice",
                      "('00:11:22:33:44:55', objectpath '/agent', '" + capability + "')");
    }
    /// What comes between the new connection and the end of a pairing with this agent.
    Lines pair(const std::string& capability = "") {
        startPairing(capability);
        client->until(device + "Connected=true");
        Lines lines = client->until("agent Release");
        client->control("ClearFaults");
        return lines;
    }
    std::string error(const std::string& name, const std::string& text) const {
        return "error pair org.bluez.Error." + name + ": " + text;
    }
    void setTimes(const std::string& times) { client->control("SetTimes", "({" + times + "},)"); }
};

TEST_F(PairingTest, SuccessComesInTheOrderOfTheDaemon) {
    addDevice(phone, "'Name': <'Phone'>, 'Passkey': <uint32 42>, 'UUIDs': <['1101']>");
    startPairing();
    EXPECT_EQ(
        client->until("reply pair"),
        (Lines{"hci0 DeviceCreated " + path, "hci0 Devices=[" + path + "]",
               device + "Connected=true", device + "Name='Phone'", device + "Alias='Phone'",
               "agent RequestConfirmation " + path + " 42", device + "Paired=true", "agent Release",
               device + "UUIDs=['00001101-0000-1000-8000-00805f9b34fb']", "reply pair " + path}));
    startPairing();
    EXPECT_EQ(client->until("error pair"), (Lines{error("AlreadyExists", "Already Exists")}));
}

TEST_F(PairingTest, ADeviceThatExistsIsOnlyPaired) {
    addDevice(phone, "'Behaviour': <'JustWorks'>");
    createDevice(phone);
    startPairing();
    EXPECT_EQ(client->until("reply pair"),
              (Lines{device + "Paired=true", "agent Release", "reply pair " + path}));
}

TEST_F(PairingTest, TheTwoCapabilitiesDecideWhatTheAgentIsAsked) {
    client->agentAnswers("RequestPasskey", "(uint32 7,)");
    const std::string confirmation = "agent RequestConfirmation " + path + " 7";
    const std::string passkey = "agent RequestPasskey " + path;
    const std::string display = "agent DisplayPasskey " + path + " 7 0x00";
    const std::string nothing = device + "Paired=true";
    const std::vector<std::vector<std::string>> rows = {
        // theirs             ""            DisplayOnly   KeyboardOnly NoInputNoOutput
        // KeyboardDisplay
        {"DisplayYesNo", confirmation, confirmation, passkey, nothing, confirmation},
        {"DisplayOnly", confirmation, confirmation, passkey, nothing, confirmation},
        {"KeyboardOnly", display, display, passkey, nothing, display},
        {"NoInputNoOutput", nothing, nothing, nothing, nothing, nothing}};
    const std::vector<std::string> ours = {"", "DisplayOnly", "KeyboardOnly", "NoInputNoOutput",
                                           "KeyboardDisplay"};
    for (const auto& row : rows) {
        for (std::size_t i = 0; i < ours.size(); ++i) {
            addDevice(phone, "'Passkey': <uint32 7>, 'Capability': <'" + row[0] + "'>");
            const Lines lines = pair(ours[i]);
            EXPECT_EQ(lines.front(), row[i + 1]) << row[0] << " and " << ours[i];
            EXPECT_EQ(lines[lines.size() - 2], device + "Paired=true");
            client->until("reply pair");
            client->control("DropLink", "('hci0', '00:11:22:33:44:55')");
            client->call(adapter, "Adapter.RemoveDevice", "(objectpath '" + devicePath() + "',)");
            client->control("RemoveDevice", "('00:11:22:33:44:55',)");
        }
    }
    startPairing("Telepathy");
    EXPECT_EQ(client->until("error pair").back(),
              error("InvalidArguments", "Invalid arguments in method call"));
}

TEST_F(PairingTest, APasskeyIsShownWhileItIsTypedThere) {
    addDevice(phone, "'Behaviour': <'DisplayPasskey'>, 'Passkey': <uint32 123456>");
    const std::string shown = "agent DisplayPasskey " + path + " 123456 0x0";
    EXPECT_EQ(pair(),
              (Lines{shown + "0", shown + "1", shown + "2", shown + "3", shown + "4", shown + "5",
                     shown + "6", "agent Cancel", device + "Paired=true", "agent Release"}));
}

TEST_F(PairingTest, APinIsShownToAnAgentThatCanAndAskedOfOneThatCannot) {
    addDevice(phone, "'Behaviour': <'DisplayPin'>, 'PIN': <'0000'>, 'Passkey': <uint32 42>");
    client->agentAnswers("DisplayPinCode", "!org.freedesktop.DBus.Error.UnknownMethod");
    client->agentAnswers("RequestPinCode", "('0000',)");
    EXPECT_EQ(pair(),
              (Lines{"agent DisplayPinCode " + path + " '000042'", "agent RequestPinCode " + path,
                     device + "Paired=true", "agent Release"}));
}

struct Failure {
    const char* settings;
    const char* method; ///< what the agent is asked
    const char* answer;
    const char* name;
    const char* text;
};

TEST_F(PairingTest, FailuresHaveTheErrorOfTheirCauseAndTakeTheDeviceBack) {
    setTimes("'PairingTimeout': <200>");
    const char* const confirm = "'Behaviour': <'ConfirmPasskey'>";
    const char* const pin = "'Behaviour': <'LegacyPin'>, 'PIN': <'1234'>";
    const char* const failed = "AuthenticationFailed";
    const char* const rejected = "AuthenticationRejected";
    const Failure failures[] = {
        {confirm, "RequestConfirmation", "!org.bluez.Error.Rejected", failed,
         "Authentication Failed"},
        {confirm, "RequestConfirmation", "!org.bluez.Error.Canceled", failed,
         "Authentication Failed"},
        {pin, "RequestPinCode", "('4321',)", failed, "Authentication Failed"},
        {"'Behaviour': <'WrongPin'>", "RequestPinCode", "('0000',)", failed,
         "Authentication Failed"},
        {pin, "RequestPinCode", "!org.bluez.Error.Rejected", rejected, "Authentication Rejected"},
        {pin, "RequestPinCode", "('',)", rejected, "Authentication Rejected"},
        {pin, "RequestPinCode", "('12345678901234567',)", rejected, "Authentication Rejected"},
        {pin, "RequestPinCode", "(uint32 1234,)", rejected, "Authentication Rejected"},
        {"'Behaviour': <'RefusesConfirmation'>", "RequestConfirmation", "", failed,
         "Authentication Failed"},
        {"'Behaviour': <'CancelsPairing'>", "RequestConfirmation", "", "AuthenticationCanceled",
         "Authentication Canceled"},
        {"'Behaviour': <'NeverAnswers'>", "RequestConfirmation", "", "AuthenticationTimeout",
         "Authentication Timeout"},
        {"'Behaviour': <'Rejects'>", "", "", rejected, "Authentication Rejected"},
        {"'Behaviour': <'RepeatedAttempts'>", "", "", "RepeatedAttempts", "Repeated Attempts"}};
    for (const Failure& failure : failures) {
        addDevice(phone, failure.settings);
        client->agentAnswers(failure.method, failure.answer);
        startPairing();
        client->until("hci0 Devices=[" + path + "]");
        const Lines lines = client->until("hci0 DeviceRemoved");
        Lines expected = {device + "Connected=true"};
        if (*failure.method) {
            ASSERT_GT(lines.size(), 1U);
            EXPECT_EQ(lines[1].find("agent " + std::string(failure.method)), 0U) << lines[1];
            expected.push_back(lines[1]);
        }
        for (const std::string& line :
             {error(failure.name, failure.text), std::string("agent Release"),
              device + "Connected=false", std::string("hci0 Devices=[]"),
              "hci0 DeviceRemoved " + path})
            expected.push_back(line);
        EXPECT_EQ(lines, expected) << failure.settings << failure.answer;
        client->control("RemoveDevice", "('00:11:22:33:44:55',)");
    }
}

TEST_F(PairingTest, NobodyThereIsAPageTimeout) {
    startPairing();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{"hci0 DeviceCreated " + path, "hci0 Devices=[" + path + "]",
                     error("ConnectionAttemptFailed", "Page Timeout"), "agent Release",
                     "hci0 Devices=[]", "hci0 DeviceRemoved " + path}));
}

class WaitingAgentTest : public PairingTest {
protected:
    /// A pairing whose agent has been asked and stays silent.
    void startWaiting(const std::string& settings = "'Passkey': <uint32 7>") {
        addDevice(phone, settings);
        client->agentAnswers("RequestConfirmation", "-");
        startPairing();
        client->until("agent RequestConfirmation");
    }
};

TEST_F(WaitingAgentTest, SilenceTimesOutWithCancel) {
    setTimes("'PairingTimeout': <100>");
    startWaiting();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{"agent Cancel", error("AuthenticationTimeout", "Authentication Timeout"),
                     "agent Release", device + "Connected=false", "hci0 Devices=[]",
                     "hci0 DeviceRemoved " + path}));
}

TEST_F(WaitingAgentTest, ALostLinkIsToldToAgentAndCaller) {
    startWaiting("'Behaviour': <'VanishesWhilePairing'>");
    EXPECT_EQ(client->until("agent Release"),
              (Lines{"agent Cancel", error("ConnectionAttemptFailed", "Connection Timeout"),
                     "agent Release"}));
}

TEST_F(WaitingAgentTest, CancellingByItsOwnerKeepsTheDaemonsOrder) {
    startWaiting();
    const std::string address = "('00:11:22:33:44:55',)";
    SimClient other;
    EXPECT_EQ(other.call(adapter, "Adapter.CancelDeviceCreation", address),
              "error org.bluez.Error.NotAuthorized: Operation Not Authorized");
    client->start("cancel", adapter, "Adapter.CancelDeviceCreation", address);
    EXPECT_EQ(client->until("error pair"),
              (Lines{device + "DisconnectRequested", "reply cancel", device + "Connected=false",
                     "agent Cancel", "hci0 Devices=[]", "hci0 DeviceRemoved " + path,
                     "agent Release", error("ConnectionAttemptFailed", "Page Timeout")}));
}

TEST_F(WaitingAgentTest, PowerOffCancels) {
    client->call(adapter, "Adapter.StartDiscovery"); // suspended; it does not come back either
    startWaiting();
    client->start("off", adapter, "Adapter.SetProperty", "('Powered', <false>)");
    EXPECT_EQ(client->until("reply off"),
              (Lines{"agent Cancel", error("AuthenticationCanceled", "Authentication Canceled"),
                     "agent Release", device + "Connected=false", "hci0 Devices=[]",
                     "hci0 DeviceRemoved " + path, "hci0 Pairable=false", "hci0 Powered=false",
                     "reply off"}));
}

TEST_F(WaitingAgentTest, ASecondPairingIsRefusedWhileOneRuns) {
    startWaiting();
    startPairing();
    EXPECT_EQ(client->until("error pair"), (Lines{error("InProgress", "In Progress")}));
    EXPECT_EQ(createDevice(phone), "error org.bluez.Error.AlreadyExists: Already Exists");
}

TEST_F(WaitingAgentTest, ThePairingEndsWithItsClient) {
    addDevice(phone);
    auto other = std::make_unique<SimClient>();
    other->agentAnswers("RequestConfirmation", "-");
    other->start("pair", adapter, "Adapter.CreatePairedDevice",
                 "('00:11:22:33:44:55', objectpath '/agent', '')");
    other->until("agent RequestConfirmation");
    client->until(device + "Connected=true");
    other.reset();
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{device + "DisconnectRequested", device + "Connected=false", "hci0 Devices=[]",
                     "hci0 DeviceRemoved " + path}));
}

TEST_F(WaitingAgentTest, AnUnregisteredAgentNoLongerAnswers) {
    addDevice(phone);
    client->agentAnswers("RequestConfirmation", "-");
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    client->control("StartIncomingPairing", "('hci0', '00:11:22:33:44:55')");
    client->until("agent RequestConfirmation");
    client->start("bye", adapter, "Adapter.UnregisterAgent", "(objectpath '/agent',)");
    EXPECT_EQ(client->until("reply bye"), (Lines{"agent Cancel", "agent Release", "reply bye"}));
    EXPECT_EQ(client->until("hci0 DeviceRemoved"),
              (Lines{device + "Connected=false", "hci0 Devices=[]", "hci0 DeviceRemoved " + path}));
}

TEST_F(PairingTest, IncomingPairingsAskTheRegisteredAgent) {
    addDevice(phone, "'Passkey': <uint32 7>, 'UUIDs': <['1101']>");
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    client->control("StartIncomingPairing", "('hci0', '00:11:22:33:44:55')");
    EXPECT_EQ(
        client->until(device + "UUIDs"),
        (Lines{"hci0 DeviceCreated " + path, "hci0 Devices=[" + path + "]",
               device + "Connected=true", "agent RequestConfirmation " + path + " 7",
               device + "Paired=true", device + "UUIDs=['00001101-0000-1000-8000-00805f9b34fb']"}));
}

TEST_F(PairingTest, IncomingPairingsJustWorkWithoutAnAgentUnlessNotPairable) {
    addDevice(phone);
    client->control("StartIncomingPairing", "('hci0', '00:11:22:33:44:55')");
    client->until(device + "Paired=true");
    addDevice("00:11:22:33:44:66");
    setProperty(adapter, "Adapter", "Pairable", "false");
    client->control("StartIncomingPairing", "('hci0', '00:11:22:33:44:66')");
    client->until("hci0 DeviceRemoved 'hci0/dev_00_11_22_33_44_66'");
}

TEST_F(PairingTest, AgentsCanBeCalledWithAnything) {
    client->call(adapter, "Adapter.RegisterAgent", "(objectpath '/agent', '')");
    client->agentAnswers("RequestPinCode", "('1234',)");
    client->agentAnswers("Nonsense", "!org.freedesktop.DBus.Error.UnknownMethod");
    client->taken();
    EXPECT_EQ(client->control("CallAgent", "('hci0', '', 'RequestPinCode', <(int16 5, 'x')>)"),
              "reply '' '' [<'1234'>]");
    EXPECT_EQ(client->taken(), (Lines{"agent RequestPinCode 5 'x'"}));
    EXPECT_EQ(client->control("CallAgent", "('hci0', 'org.bluez.Other', 'Nonsense', <@av []>)"),
              "reply 'org.freedesktop.DBus.Error.UnknownMethod' 'said no' []");
}

} // namespace

} // namespace Bluetooth::Test
