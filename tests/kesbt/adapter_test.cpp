// SPDX-License-Identifier: LGPL-2.1-or-later
#include "kesbt/kesbt_test.h"

namespace Bluetooth::Test {

class AdapterVerbs : public KesbtTest {};

TEST_F(AdapterVerbs, AdaptersAreListedAndChosenByNameOrAddress) {
    const Json adapters = json("adapters");
    ASSERT_EQ(adapters.size(), 2U);
    EXPECT_EQ(adapters[0]["default"], true);
    EXPECT_EQ(adapters[1]["default"], false);
    EXPECT_EQ(Json::parse(run("--json adapter info").out)["path"], adapters[0]["path"]);
    for (const char* choice : {"hci1", "00:1A:7D:DA:71:11", "00:1a:7d:da:71:11"})
        EXPECT_EQ(json("--adapter "s + choice + " adapter")["adapter"], "hci1");
    EXPECT_EQ(failure("adapter --adapter hci9"),
              "there is no adapter hci9; see which there are: kesbt adapters\n");
}

TEST_F(AdapterVerbs, SetTellsOldAndNewValueInThePropertysOwnType) {
    EXPECT_EQ(run("adapter set powered off"), (Result{0, "Powered: yes -> no\n", ""}));
    EXPECT_EQ(run("adapter set Powered true").out, "Powered: no -> yes\n");
    EXPECT_EQ(run("adapter set DiscoverableTimeout 60").out, "DiscoverableTimeout: 0 -> 60\n");
    EXPECT_EQ(
        json("adapter set Name 42"),
        (Json{{"adapter", "hci0"}, {"property", "Name"}, {"old", "kestrine-0"}, {"new", "42"}}));
    EXPECT_EQ(adapterProperties()["Name"], "42");
}

TEST_F(AdapterVerbs, SetRefusesWhatCannotBeSet) {
    const std::string see = "; see what can be set: kesbt adapter set --help\n";
    EXPECT_EQ(failure("adapter set Address x"),
              "the daemon does not let Address of hci0 be set to \"x\"" + see);
    EXPECT_EQ(failure("adapter set UUIDs x"),
              "UUIDs cannot be set; see what can be set: kesbt adapter set --help\n");
    EXPECT_EQ(failure("adapter set Colour red"), "hci0 has no property \"Colour\"" + see);
    failure("adapter set Powered perhaps", 2);
    failure("adapter set PairableTimeout -1", 2);
    failure("adapter set PairableTimeout 4294967296", 2);
    failure("adapter set Name "s + std::string(249, 'n'), 2);
    EXPECT_EQ(adapterProperties()["PairableTimeout"], 0);
}

TEST_F(AdapterVerbs, ACallThatDoesNothingOrIsNotAnsweredIsAFailure) {
    // The daemon answers and changes nothing: only reading back shows it.
    simulation.control("DropName");
    RawPeer liar(simulation.bus().address(), "org.bluez");
    liar.reply("DefaultAdapter", with(Path{"/org/bluez/1/hci0"}));
    liar.reply("SetProperty");
    liar.reply("GetProperties",
               [](Writer& w) { w.dict("sv", [](Writer& d) { d.entry("Powered", Var{true}); }); });
    const char* const switchOff = "--timeout 0.3 adapter set Powered off";
    EXPECT_EQ(failure(switchOff),
              "Powered of hci0 is still \"yes\" within the time-out; try again or give a longer "
              "--timeout\n");
    liar.neverReply("SetProperty");
    EXPECT_EQ(failure(switchOff).substr(0, 44), "cannot set Powered of hci0 within the time-o");
    // The library's own calls wait for longer than the user wants to.
    liar.neverReply("GetProperties");
    EXPECT_EQ(failure(switchOff),
              "no answer within the time-out; try again or give a longer --timeout\n");
    failure("adapter info --timeout 0.3");
}

TEST_F(AdapterVerbs, NamesFromOutsideCannotControlTheTerminal) {
    const std::string name = "a\x1b[2J\nb\xc3\xa9\u009b\u202a\u202e\u2066\u2069\u202f\u2065";
    run("adapter set Name " + name);
    EXPECT_NE(run("adapters")
                  .out.find("a\\x1b[2J\\nb\xc3\xa9\\x9b\\u202a\\u202e\\u2066\\u2069"
                            "\u202f\u2065\n"),
              std::string::npos);
    EXPECT_EQ(adapterProperties()["Name"], name);
    EXPECT_NE(runShell("script -qec '" KESBT " adapter --json' /dev/null")
                  .out.find("\"a\\u001b[2J\\nb\xc3\xa9\\u009b\\u202a\\u202e\\u2066\\u2069"
                            "\u202f\u2065\""),
              std::string::npos);
    // What is no UTF-8: alone, at the end, too long for what it is, beside what is.
    EXPECT_NE(failure("devices --adapter \x9b[2J\xc0\x9b\xff\U0001f600\xe2\x80", 2)
                  .find("\"\\x9b[2J\\xc0\\x9b\\xff\U0001f600\\xe2\\x80\""),
              std::string::npos);
}

TEST_F(AdapterVerbs, ColoursAreForTerminalsOnlyAndNoColorEndsThem) {
    const auto onTerminal = [](const std::string& environment) {
        return runShell("env TERM=xterm " + environment +
                        " script -qec '" KESBT " adapters; " KESBT
                        " wait found 00:11:22:33:44:01' /dev/null")
            .out;
    };
    EXPECT_NE(onTerminal("X=").find("\033["), std::string::npos);
    EXPECT_NE(onTerminal("X=").find("Waiting until"), std::string::npos); // and only there
    EXPECT_NE(onTerminal("NO_COLOR=").find("\033["), std::string::npos);  // not empty, to count
    EXPECT_EQ(onTerminal("NO_COLOR=1").find("\033["), std::string::npos);
    EXPECT_EQ(onTerminal("TERM=dumb").find("\033["), std::string::npos);
    EXPECT_EQ(run("adapters").out.find("\033["), std::string::npos);
}

} // namespace Bluetooth::Test
