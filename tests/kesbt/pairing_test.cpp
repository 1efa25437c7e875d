// SPDX-License-Identifier: LGPL-2.1-or-later
#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

class Pairing : public KesbtTest {
protected:
    static std::string begun(const std::string& address) {
        return "Pairing with " + address + " on hci0 (Ctrl-C stops it)\n";
    }
    static Json pairedProperty(const std::string& address) {
        return json("device "s + address)["properties"]["Paired"];
    }
    void comeIn(const char* address) {
        simulation.control("StartIncomingPairing", with("hci0", address));
    }
};

TEST_F(Pairing, APinIsGivenAndAWrongOneFails) {
    EXPECT_EQ(run("pair "s + pinReceiver),
              (Result{1, "",
                      begun(pinReceiver) +
                          "00:11:22:33:44:04 asks for a PIN code: 5820\n"
                          "cannot pair with 00:11:22:33:44:04: Authentication Failed; check the "
                          "PIN or passkey, and confirm on the device\n"}));
    const Result paired = run("pair "s + pinReceiver + " --pin 1234 --json");
    EXPECT_EQ(paired.status, 0);
    EXPECT_EQ(paired.err, begun(pinReceiver) + "00:11:22:33:44:04 asks for a PIN code: 1234\n");
    EXPECT_EQ(Json::parse(paired.out)["properties"]["Paired"], true);
    EXPECT_NE(run("pair "s + pinReceiver).err.find("Already Exists"), std::string::npos);
}

TEST_F(Pairing, PasskeysAreConfirmedRefusedShownAndEntered) {
    const Result refused = run("pair "s + phone + " --reject");
    EXPECT_EQ(refused.status, 1);
    EXPECT_NE(refused.err.find(": rejected\n"), std::string::npos) << refused;
    const Result confirmed = run("pair "s + phone);
    EXPECT_EQ(confirmed.status, 0);
    EXPECT_NE(confirmed.err.find(": accepted\n"), std::string::npos) << confirmed;

    const Result shown = run("pair "s + keyboard);
    EXPECT_EQ(shown.status, 0);
    EXPECT_EQ(shown.err.substr(begun(keyboard).size(), 5), "Type ");
    EXPECT_NE(shown.err.find(" on 00:11:22:33:44:02\n"), std::string::npos);

    const Result entered =
        run("pair "s + carKit + " --capability KeyboardOnly --pin 424242 --delay 1");
    EXPECT_EQ(entered.status, 0);
    EXPECT_NE(entered.err.find("asks for a passkey: 424242\n"), std::string::npos) << entered;
    EXPECT_EQ(run("pair "s + headset + " --capability NoInputNoOutput").err, begun(headset));
}

TEST_F(Pairing, OnlyItsProgramCancelsItAndADaemonThatLeavesEndsIt) {
    EXPECT_EQ(failure("cancel "s + unreachableLaptop),
              "no creation of 00:11:22:33:44:07 is under way on hci0; see what happens with: kesbt "
              "monitor\n");
    setTimeScale(1);
    const auto pairing = start("pair "s + unreachableLaptop);
    awaitCall("CreatePairedDevice");
    EXPECT_EQ(failure("cancel "s + unreachableLaptop),
              "cannot cancel the creation of 00:11:22:33:44:07: Operation Not Authorized; only the "
              "program that began it can do this\n");
    simulation.process().kill();
    EXPECT_EQ(pairing->finish(), (Result{1, "", begun(unreachableLaptop) + absentDaemon}));
}

TEST_F(Pairing, TheAgentAnswersDevicesThatComeAndTellsSo) {
    const auto agent = start("agent --pin 1234 --json");
    EXPECT_EQ(awaitEvent(*agent, "event", "registered")["adapter"], "hci0");
    EXPECT_EQ(failure("agent"), "hci0 has an agent of another program; end that program first\n");

    comeIn(pinReceiver);
    const Json pin = awaitEvent(*agent, "event", "request");
    EXPECT_EQ(pin["request"], "RequestPinCode");
    EXPECT_EQ(pin["address"], pinReceiver);
    EXPECT_EQ(pin["answer"], "1234");

    comeIn(phone);
    const Json confirmation = awaitEvent(*agent, "request", "RequestConfirmation");
    EXPECT_EQ(confirmation["address"], phone);
    EXPECT_EQ(confirmation["detail"].get<std::string>().size(), 6U);
    EXPECT_EQ(confirmation["answer"], "accepted");

    agent->signal(SIGINT);
    EXPECT_EQ(errorsOf(*agent, 0), "");
    EXPECT_EQ(calls("UnregisterAgent"), 1U);
    while (pairedProperty(phone) != true) { // the pairing goes on without the agent
    }
}

TEST_F(Pairing, TheAgentIsReadableByPeopleAndEndsWithTheDaemon) {
    const auto agent = start("agent --reject");
    EXPECT_EQ(agent->readLine().substr(12),
              "  Agent registered on hci0, waiting for requests (Ctrl-C ends it)");
    comeIn(phone);
    const std::string line = agent->readLine();
    EXPECT_EQ(line.substr(12, 52),
              "  00:11:22:33:44:03 asks to confirm the passkey " + line.substr(60, 4));
    EXPECT_EQ(line.substr(line.size() - 10), ": rejected");
    simulation.control("Restart");
    EXPECT_EQ(errorsOf(*agent),
              "bluetoothd has released the agent; register it again: kesbt agent\n");
}

} // namespace Bluetooth::Test
