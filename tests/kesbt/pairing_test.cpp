#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

namespace {

class Pairing : public KesbtTest {
protected:
    static std::string begun(const std::string& address) {
        return "Pairing with " + address + " on hci0 (Ctrl-C stops it)\n";
    }
    static Json pairedProperty(const std::string& address) {
        return run({"device", address, "--json"}).json()["properties"]["Paired"];
    }
    void comeIn(const char* address) {
        control("StartIncomingPairing", [address](Writer& w) { w("hci0")(address); });
    }
};

TEST_F(Pairing, APinIsGivenAndAWrongOneFails) {
    EXPECT_EQ(
        run({"pair", gps}),
        (Result{1, "",
                begun(gps) + "00:11:22:33:44:04 asks for a PIN code: 5820\n"
                             "cannot pair with 00:11:22:33:44:04: Authentication Failed; check the "
                             "PIN or passkey, and confirm on the device\n"}));
    const Result paired = run({"pair", gps, "--pin", "1234", "--json"});
    EXPECT_EQ(paired.status, 0);
    EXPECT_EQ(paired.err, begun(gps) + "00:11:22:33:44:04 asks for a PIN code: 1234\n");
    EXPECT_EQ(paired.json()["properties"]["Paired"], true);
    EXPECT_NE(run({"pair", gps}).err.find("Already Exists"), std::string::npos);
}

TEST_F(Pairing, PasskeysAreConfirmedRefusedShownAndEntered) {
    const Result refused = run({"pair", phone, "--reject"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_NE(refused.err.find(": rejected\n"), std::string::npos) << refused;
    const Result confirmed = run({"pair", phone});
    EXPECT_EQ(confirmed.status, 0);
    EXPECT_NE(confirmed.err.find(": accepted\n"), std::string::npos) << confirmed;

    const Result shown = run({"pair", keyboard});
    EXPECT_EQ(shown.status, 0);
    EXPECT_EQ(shown.err.substr(begun(keyboard).size(), 5), "Type ");
    EXPECT_NE(shown.err.find(" on 00:11:22:33:44:02\n"), std::string::npos);

    const Result entered = run({"pair", "00:11:22:33:44:08", "--capability", "KeyboardOnly",
                                "--pin", "424242", "--delay", "1"});
    EXPECT_EQ(entered.status, 0);
    EXPECT_NE(entered.err.find("asks for a passkey: 424242\n"), std::string::npos) << entered;
    EXPECT_EQ(run({"pair", headset, "--capability", "NoInputNoOutput"}).err, begun(headset));
}

TEST_F(Pairing, CtrlCCancelsTheCreation) {
    setTimeScale(1);
    const auto pairing = start({"pair", laptop});
    awaitCall("CreatePairedDevice");
    EXPECT_EQ(failure({"cancel", laptop}),
              "cannot cancel the creation of 00:11:22:33:44:07: Operation Not Authorized; only the "
              "program that began it can do this\n");
    pairing->signal(SIGINT);
    EXPECT_EQ(finish(*pairing),
              (Result{1, "",
                      begun(laptop) + "interrupted while pairing with 00:11:22:33:44:07; "
                                      "repeat the command to try again\n"}));
    EXPECT_EQ(calls("CancelDeviceCreation"), 2U);
    failure({"device", laptop});
    EXPECT_EQ(failure({"cancel", laptop}),
              "no creation of 00:11:22:33:44:07 is under way on hci0; see what happens with: kesbt "
              "monitor\n");
}

TEST_F(Pairing, AGivenTimeOutEndsIt) {
    setTimeScale(1);
    const Result result = run({"--timeout", "0.3", "pair", laptop});
    EXPECT_EQ(result.status, 1);
    EXPECT_NE(result.err.find("time is over while pairing with"), std::string::npos) << result;
    awaitCall("CancelDeviceCreation");
}

TEST_F(Pairing, ADaemonThatLeavesMeanwhileIsAFailure) {
    setTimeScale(1);
    const auto pairing = start({"pair", laptop});
    awaitCall("CreatePairedDevice");
    daemon->kill();
    EXPECT_EQ(finish(*pairing), (Result{1, "", begun(laptop) + absentDaemon}));
}

TEST_F(Pairing, TheAgentAnswersDevicesThatComeAndTellsSo) {
    const auto agent = start({"agent", "--pin", "1234", "--json"});
    EXPECT_EQ(awaitEvent(*agent, "event", "registered")["adapter"], "hci0");
    EXPECT_EQ(failure({"agent"}), "hci0 has an agent of another program; end that program first\n");

    comeIn(gps);
    const Json pin = awaitEvent(*agent, "event", "request");
    EXPECT_EQ(pin["request"], "RequestPinCode");
    EXPECT_EQ(pin["address"], gps);
    EXPECT_EQ(pin["answer"], "1234");

    comeIn(phone);
    const Json confirmation = awaitEvent(*agent, "request", "RequestConfirmation");
    EXPECT_EQ(confirmation["address"], phone);
    EXPECT_EQ(confirmation["detail"].get<std::string>().size(), 6U);
    EXPECT_EQ(confirmation["answer"], "accepted");

    agent->signal(SIGINT);
    const Result result = finish(*agent);
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(calls("UnregisterAgent"), 1U);
    while (pairedProperty(phone) != true) { // the pairing goes on without the agent
    }
}

TEST_F(Pairing, TheAgentIsReadableByPeopleAndEndsWithTheDaemon) {
    const auto agent = start({"agent", "--reject"});
    EXPECT_EQ(agent->readLine().substr(12),
              "  Agent registered on hci0, waiting for requests (Ctrl-C ends it)");
    comeIn(phone);
    const std::string line = agent->readLine();
    EXPECT_EQ(line.substr(12, 52),
              "  00:11:22:33:44:03 asks to confirm the passkey " + line.substr(60, 4));
    EXPECT_EQ(line.substr(line.size() - 10), ": rejected");
    control("Restart");
    const Result result = finish(*agent);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "bluetoothd has released the agent; register it again: kesbt agent\n");
}

} // namespace

} // namespace Bluetooth::Test
