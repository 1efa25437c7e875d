// SPDX-License-Identifier: LGPL-2.1-or-later
#include "kesbt/kesbt_test.h"

#include <csignal>

namespace Bluetooth::Test {

class Pairing : public KesbtTest {
protected:
    static std::string begun(const std::string& address) {
        return "Pairing with " + address + " on hci0 (Ctrl-C stops it)\n";
    }
    /// The end of the line where nobody can be asked.
    const std::string nobody = "there is no terminal to ask at; answer with ";
    static Json pairedProperty(const std::string& address) {
        return json("device "s + address)["properties"]["Paired"];
    }
    void comeIn(const char* address) {
        simulation.control("StartIncomingPairing", with("hci0", address));
    }
};

TEST_F(Pairing, APinIsGivenAndAWrongOneFails) {
    EXPECT_EQ(run("pair "s + pinReceiver + " --pin 5820"),
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
    const Result confirmed = run("pair "s + phone + " --yes");
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

TEST_F(Pairing, SomebodyAtATerminalIsAskedAndNobodyElsewhere) {
    simulation.setDevice(pinReceiver, "Name", "GPS\x1b[2J");
    const std::string confirm = "\"Phone\", which has to show the passkey ";
    const std::string pin = "PIN code for 00:11:22:33:44:04 \"GPS\\x1b[2J\" (empty refuses): ";
    const std::string passkey =
        "Passkey that 00:11:22:33:44:08 \"Car Kit\" shows (empty refuses): ";
    const std::string refused = ": it was refused here; repeat the command to answer otherwise\n";
    const struct {
        std::string arguments, question, keys, end;
        const char* option; // what is missing where nobody can be asked
        int status = 1;
    } rows[] = {
        {phone, confirm, "no\n", refused, "--yes"},
        {phone, confirm, "\n", refused, "--yes"},
        {pinReceiver, pin, "\x04", refused, "--pin TEXT"},
        {phone, confirm, "\x03",
         "interrupted while pairing with 00:11:22:33:44:03; repeat the "
         "command to try again\n",
         "--yes"},
        {phone, confirm, "Y\n", "[y/N] Y\n", "--yes", 0},
        {pinReceiver, pin, "12345678901234567\n1234\n", "\na PIN has 1 to 16 characters\n" + pin,
         "--pin TEXT", 0},
        {carKit + " --capability KeyboardOnly"s, passkey, "1e3\n424242\n",
         "\na passkey has 1 to 6 digits\n" + passkey, "--pin PASSKEY", 0},
    };
    for (const auto& row : rows) {
        const std::string arguments = "pair " + row.arguments + " --json";
        const Result alone = run(arguments);
        EXPECT_EQ(alone.status, 1);
        EXPECT_NE(alone.err.find(nobody + row.option + "\n"), std::string::npos) << alone;

        const auto pairing = startAtTerminal(arguments);
        pairing->readUntil(row.question);
        pairing->type(row.keys);
        const Result result = pairing->finish();
        EXPECT_EQ(result.status, row.status) << result;
        EXPECT_NE(result.err.find(row.end), std::string::npos) << result;
        EXPECT_EQ(result.status == 0, !result.out.empty());
        if (result.status == 0) {
            EXPECT_EQ(Json::parse(result.out)["properties"]["Paired"], true);
        }
    }
}

TEST_F(Pairing, AQuestionGoesWithWhatItIsAbout) {
    const auto ask = [&](const std::string& options) {
        auto pairing = startAtTerminal(options + "pair " + phone);
        pairing->readUntil("[y/N] ");
        return pairing;
    };
    EXPECT_EQ(errorsOf(*ask("--timeout 1 ")), "\nthe question was not answered in time; repeat the "
                                              "command and answer, or give a longer --timeout\n");
    auto pairing = ask("");
    run("adapter set Powered off");
    EXPECT_EQ(errorsOf(*pairing).substr(0, 62),
              "\ncannot pair with 00:11:22:33:44:03: Authentication Canceled; ");
    run("adapter set Powered on");
    pairing = ask("");
    simulation.process().kill();
    EXPECT_EQ(errorsOf(*pairing), "\n"s + absentDaemon);
}

TEST_F(Pairing, ADelayHoldsUpNeitherTheTimeOutNorAnInterruption) {
    const std::string delayed = "pair "s + phone + " --yes --delay 9999";
    EXPECT_NE(run("--timeout 1 " + delayed).err.find("time is over"), std::string::npos);
    auto program = start(delayed);
    awaitCall("CreatePairedDevice", 2);
    program->signal(SIGINT);
    EXPECT_NE(errorsOf(*program).find("interrupted"), std::string::npos);

    program = start("agent --json --yes --delay 9999");
    awaitEvent(*program, "event", "registered");
    comeIn(phone);
    program->signal(SIGTERM);
    EXPECT_EQ(errorsOf(*program, 0), "");
    EXPECT_EQ(run("pair "s + phone + " --yes").status, 0) << "something was left behind";
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
    EXPECT_EQ(failure("agent", 2), nobody + "--yes, --pin TEXT or --reject\n");
    const auto agent = start("agent --yes --pin 1234 --json");
    EXPECT_EQ(awaitEvent(*agent, "event", "registered")["adapter"], "hci0");
    EXPECT_EQ(failure("agent --yes"),
              "hci0 has an agent of another program; end that program first\n");

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

TEST_F(Pairing, TheAgentAsksForEachDeviceThatComes) {
    const auto agent = startAtTerminal("agent --json");
    awaitEvent(*agent, "event", "registered");
    comeIn(phone);
    agent->readUntil("Pair with 00:11:22:33:44:03");
    agent->readUntil("[y/N] ");
    agent->type("y\n");
    EXPECT_EQ(awaitEvent(*agent, "event", "request")["answer"], "accepted");
    comeIn(pinReceiver);
    agent->readUntil("PIN code for ");
    run("adapter set Powered off");
    EXPECT_EQ(awaitEvent(*agent, "event", "request")["request"], "Cancel");
    agent->type("\x03");
    EXPECT_EQ(agent->finish().status, 0);
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
