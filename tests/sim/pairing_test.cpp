// SPDX-License-Identifier: LGPL-2.1-or-later
#include "sim/sim_test.h"

namespace Bluetooth::Test {

class SimPairingTest : public SimTest {
protected:
    void startPairing(const char* capability = "") {
        taken();
        start({"Adapter.CreatePairedDevice", newDevice, agent, capability});
    }
    /// What comes between the new connection and the end of a pairing with this agent.
    Texts pair(const char* capability = "") {
        startPairing(capability);
        until("device Connected=b:1");
        Texts came = until("agent Release");
        control("ClearFaults");
        return came;
    }
    void comeToPair(const char* address = newDevice) {
        control({"StartIncomingPairing", "hci0", address});
    }
    /// A pairing whose agent has been asked and stays silent.
    void startWaiting(const Settings& settings = {{"Passkey", "7"}}) {
        add(settings);
        peer().neverReply("RequestConfirmation");
        startPairing();
        until("agent RequestConfirmation");
    }
    void forgetDevice() {
        control({"DropLink", "hci0", newDevice});
        call({"Adapter.RemoveDevice", device});
    }

    const std::string answer = "answer CreatePairedDevice";
    const std::string failed = answer + " error ";
    const std::string paired = "device Paired=b:1";
    const std::string connected = "device Connected=b:1";
    const std::string uuids = "device UUIDs=a(s:00001101-0000-1000-8000-00805f9b34fb)";
    const Texts disconnected = lines("device Connected=b:0") + removed;
};

TEST_F(SimPairingTest, SuccessComesInTheOrderOfTheDaemon) {
    add({{"Name", "Phone"}, {"Passkey", "42"}, {"UUIDs", "1101"}});
    startPairing();
    EXPECT_EQ(until(answer),
              created + lines(connected, "device Name=s:Phone", "device Alias=s:Phone",
                              "agent RequestConfirmation o:device u:42", paired, "agent Release",
                              uuids, answer + " o:device"));
    startPairing();
    EXPECT_EQ(until(answer), lines(failed + "AlreadyExists: Already Exists"));
}

TEST_F(SimPairingTest, ADeviceThatExistsIsOnlyPaired) {
    create({{"Behaviour", "JustWorks"}});
    startPairing();
    EXPECT_EQ(until(answer), lines(paired, "agent Release", answer + " o:device"));
}

TEST_F(SimPairingTest, TheTwoCapabilitiesDecideWhatTheAgentIsAsked) {
    peer().reply("RequestPasskey", with(7U));
    const std::string confirmation = "agent RequestConfirmation o:device u:7";
    const std::string passkey = "agent RequestPasskey o:device";
    const std::string display = "agent DisplayPasskey o:device u:7";
    const std::string& nothing = paired;
    const char* const ours[] = {"", "DisplayOnly", "KeyboardOnly", "NoInputNoOutput",
                                "KeyboardDisplay"};
    const Texts rows[] = {
        // theirs, and what follows for each of ours
        {"DisplayYesNo", confirmation, confirmation, passkey, nothing, confirmation},
        {"DisplayOnly", confirmation, confirmation, passkey, nothing, confirmation},
        {"KeyboardOnly", display, display, passkey, nothing, display},
        {"NoInputNoOutput", nothing, nothing, nothing, nothing, nothing}};
    for (const auto& row : rows) {
        auto expected = row.begin();
        for (const char* capability : ours) {
            add({{"Passkey", "7"}, {"Capability", row[0]}});
            const Texts came = pair(capability);
            EXPECT_EQ(came.front(), *++expected) << row[0] << " and " << capability;
            EXPECT_EQ(came[came.size() - 2], paired);
            until(answer + " o:");
            forgetDevice();
            control({"RemoveDevice", newDevice});
        }
    }
    startPairing("Telepathy");
    EXPECT_EQ(until(answer).back(), answer + " " + badArguments);
}

TEST_F(SimPairingTest, APasskeyIsShownOnceWhileItIsTypedThere) {
    add({{"Behaviour", "DisplayPasskey"}, {"Passkey", "123456"}});
    EXPECT_EQ(pair(), lines("agent DisplayPasskey o:device u:123456", paired, "agent Release"));
}

TEST_F(SimPairingTest, APinIsShownToAnAgentThatCanAndAskedOfOneThatCannot) {
    add({{"Behaviour", "DisplayPin"}, {"PIN", "0000"}, {"Passkey", "42"}});
    peer().replyError("DisplayPinCode", DBUS_ERROR_UNKNOWN_METHOD, "");
    peer().reply("RequestPinCode", with("0000"));
    EXPECT_EQ(pair(), lines("agent DisplayPinCode o:device s:000042",
                            "agent RequestPinCode o:device", paired, "agent Release"));
}

TEST_F(SimPairingTest, FailuresHaveTheErrorOfTheirCauseAndTakeTheDeviceBack) {
    setTime("PairingTimeout", "200");
    const char* const authentication = "Failed: Authentication Failed";
    const char* const rejected = "Rejected: Authentication Rejected";
    const char* const refusal = "org.bluez.Error.Rejected";
    const struct {
        const char* behaviour;
        const char* request; ///< what the agent is asked
        const char* refusal; ///< what it answers, or else:
        Writer::Build answer;
        std::string error;
    } failures[] = {
        {"ConfirmPasskey", "RequestConfirmation", refusal, {}, authentication},
        {"ConfirmPasskey", "RequestConfirmation", "org.bluez.Error.Canceled", {}, authentication},
        {"LegacyPin", "RequestPinCode", nullptr, with("4321"), authentication},
        {"WrongPin", "RequestPinCode", nullptr, with("0000"), authentication}, // the device's own
        {"LegacyPin", "RequestPinCode", refusal, {}, rejected},
        {"LegacyPin", "RequestPinCode", nullptr, with(""), rejected},
        {"LegacyPin", "RequestPinCode", nullptr, with("12345678901234567"), rejected},
        {"LegacyPin", "RequestPinCode", nullptr, with(1234U), rejected},
        {"RefusesConfirmation", "RequestConfirmation", nullptr, {}, authentication},
        {"CancelsPairing", "RequestConfirmation", nullptr, {}, "Canceled: Authentication Canceled"},
        {"NeverAnswers", "RequestConfirmation", nullptr, {}, "Timeout: Authentication Timeout"},
        {"Rejects", nullptr, nullptr, {}, rejected}};
    for (const auto& failure : failures) {
        add({{"Behaviour", failure.behaviour}});
        Texts expected = lines(connected);
        if (failure.request) {
            peer().reply(failure.request, failure.answer);
            expected.push_back(std::string("agent ") + failure.request + " o:device");
        }
        if (failure.refusal)
            peer().replyError(failure.request, failure.refusal, "");
        startPairing();
        until(created[1]);
        Texts came = until(removed[1]);
        for (std::string& line : came)
            line = line.substr(0, line.find(" u:")); // the passkey to confirm
        EXPECT_EQ(came, expected +
                            lines(failed + "Authentication" + failure.error, "agent Release") +
                            disconnected)
            << failure.behaviour << " and " << failure.error;
        control({"RemoveDevice", newDevice});
    }
    add({{"Behaviour", "RepeatedAttempts"}});
    startPairing();
    EXPECT_EQ(until(answer).back(), failed + "RepeatedAttempts: Repeated Attempts");
    until(removed[1]);
    control({"RemoveDevice", newDevice});
    startPairing(); // and nobody there is a page timeout
    EXPECT_EQ(until(removed[1]),
              created + lines(failed + "ConnectionAttemptFailed: Page Timeout", "agent Release") +
                  removed);
}

TEST_F(SimPairingTest, SilenceTimesOutWithCancel) {
    setTime("PairingTimeout", "100");
    startWaiting();
    EXPECT_EQ(until(removed[1]),
              lines("agent Cancel", failed + "AuthenticationTimeout: Authentication Timeout",
                    "agent Release") +
                  disconnected);
}

TEST_F(SimPairingTest, ALostLinkIsToldToAgentAndCaller) {
    startWaiting({{"Behaviour", "VanishesWhilePairing"}});
    EXPECT_EQ(until(answer),
              lines("device Connected=b:0", "agent Cancel") + removed +
                  lines("agent Release", failed + "ConnectionAttemptFailed: Page Timeout"));
}

TEST_F(SimPairingTest, CancellingByItsOwnerKeepsTheDaemonsOrder) {
    startWaiting();
    startPairing();
    EXPECT_EQ(until(answer), lines(failed + "InProgress: In Progress"));
    EXPECT_EQ(call({"Adapter.CreateDevice", newDevice}), "error AlreadyExists: Already Exists");
    SimClient other;
    const Question cancel("Adapter.CancelDeviceCreation", newDevice);
    EXPECT_EQ(other.call(cancel), "error NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(trace(cancel, answer),
              lines("device DisconnectRequested", "answer CancelDeviceCreation",
                    "device Connected=b:0", "agent Cancel") +
                  removed +
                  lines("agent Release", failed + "ConnectionAttemptFailed: Page Timeout"));
}

TEST_F(SimPairingTest, ACreationAndAPairingShareTheLink) {
    add({{"UUIDs", "1101"}});
    setTime("Connect", "50000"); // all is asked before the link is up
    start({"Adapter.CreateDevice", newDevice});
    startPairing();
    const Question discover("Device.DiscoverServices", "");
    EXPECT_EQ(call({"Adapter.CreateDevice", newDevice}), "error AlreadyExists: Already Exists");
    EXPECT_EQ(call(discover), "error InProgress: In Progress");
    EXPECT_EQ(call("Device.CancelDiscovery"), "error NotAuthorized: Operation Not Authorized");
    EXPECT_EQ(until("answer CreateD").back(), "answer CreateDevice o:device");
    EXPECT_EQ(until(answer).back(), answer + " o:device");
    forgetDevice();

    // A search that is still running when the pairing succeeds takes its reply away.
    setTime("ServiceSearch", "20000");
    startPairing();
    start(discover);
    EXPECT_EQ(call("Device.Disconnect"), "error NotConnected: Not Connected");
    until(paired);
    until("answer DiscoverServices a(e(u:65536");
    control("ClearFaults");
    EXPECT_EQ(taken(), Texts{});
    forgetDevice();

    // Nobody there: both are told.
    control({"SetDevice", newDevice, Settings{{"Connectable", "false"}}});
    start({"Adapter.CreateDevice", newDevice});
    startPairing();
    until("answer CreateDevice error Failed: Host is down");
    EXPECT_EQ(until(removed[1]),
              lines(failed + "ConnectionAttemptFailed: Page Timeout", "agent Release") + removed);
}

TEST_F(SimPairingTest, PowerOffCancels) {
    call("Adapter.StartDiscovery"); // suspended; it does not come back either
    startWaiting();
    EXPECT_EQ(set("Powered", false),
              lines("agent Cancel", failed + "AuthenticationCanceled: Authentication Canceled",
                    "agent Release") +
                  disconnected +
                  lines("hci0 Pairable=b:0", "hci0 Powered=b:0", "answer SetProperty"));
}

TEST_F(SimPairingTest, ThePairingEndsWithItsClient) {
    add();
    auto other = std::make_unique<SimClient>();
    other->peer().neverReply("RequestConfirmation");
    other->start({"Adapter.CreatePairedDevice", newDevice, agent, ""});
    other->until("agent RequestConfirmation");
    until(connected);
    other.reset();
    EXPECT_EQ(until(removed[1]), lines("device DisconnectRequested") + disconnected);
}

TEST_F(SimPairingTest, AnUnregisteredAgentNoLongerAnswers) {
    add();
    peer().neverReply("RequestConfirmation");
    registerAgent();
    comeToPair();
    until("agent RequestConfirmation");
    EXPECT_EQ(trace({"Adapter.UnregisterAgent", agent}),
              lines("agent Cancel", "agent Release", "answer UnregisterAgent"));
    EXPECT_EQ(until(removed[1]), disconnected);
}

TEST_F(SimPairingTest, IncomingPairingsAskTheRegisteredAgentAndJustWorkWithoutOne) {
    add({{"Passkey", "7"}, {"UUIDs", "1101"}});
    comeToPair();
    until(uuids);
    forgetDevice();
    registerAgent();
    taken();
    comeToPair();
    EXPECT_EQ(until(uuids),
              created + lines(connected, "agent RequestConfirmation o:device u:7", paired, uuids));
    set("Pairable", false);
    add({}, otherDevice);
    comeToPair(otherDevice);
    until("hci0 DeviceRemoved o:hci0/dev_00_11_22_33_44_66");
}

} // namespace Bluetooth::Test
