// SPDX-License-Identifier: LGPL-2.1-or-later
// What the program says before there is anything to do, and when nothing can be done.

#include "kesbt/kesbt_test.h"

#include <iterator>
#include <sstream>
#include <tuple>

namespace Bluetooth::Test {

TEST(Usage, WrongUsageIsOneLineThatSaysWhereToReadOnAndStatus2) {
    const std::tuple<std::string, std::string, std::string> wrong[] = {
        {"", "a verb is missing", ""},
        {"help", "there is no verb \"help\" (did you mean kesbt --help?)", ""},
        {"unpair", "there is no verb \"unpair\" (did you mean kesbt remove ADDRESS?)", ""},
        {"--adapter hci1 power off",
         "there is no verb \"power\" (did you mean kesbt --adapter hci1 adapter set Powered off?)",
         ""},
        {"connect "s + headset,
         "there is no verb \"connect\" (did you mean kesbt audio connect 00:11:22:33:44:01?)", ""},
        {"audio headset play", "there is no verb \"headset\" (did you mean kesbt headset?)",
         "audio "},
        {"scan on", "there is no verb \"on\" (did you mean kesbt discover?)", "scan "},
        {"agent on", "\"on\" is too much (did you mean kesbt agent?)", "agent "},
        {"adaptres", "there is no verb \"adaptres\" (did you mean adapters?)", ""},
        {"wait pared "s + headset, "there is no verb \"pared\" (did you mean paired?)", "wait "},
        {"devices --timout=5", "there is no option \"--timout=5\" (did you mean --timeout?)",
         "devices "},
        {"devices too much", "\"too\" is too much", "devices "},
        {"audio", "a verb is missing", "audio "},
        {"device", "ADDRESS is required", "device "},
        {"device 00:11:22", "ADDRESS: \"00:11:22\" is no address such as 00:11:22:33:44:55",
         "device "},
        {"--adapter /org/bluez/1/hci0 devices",
         "--adapter: \"/org/bluez/1/hci0\" is no adapter such as hci0", ""},
        {"discover --seconds 0", "--seconds: \"0\" is no time such as 10 or 0.5", "discover "},
        {"pair "s + headset + " --pin 12345678901234567", "--pin: a PIN has 1 to 16 characters",
         "pair "},
        {"pair "s + headset + " --capability Telepathy",
         "--capability: \"Telepathy\" is none of DisplayYesNo, DisplayOnly, KeyboardOnly, "
         "NoInputNoOutput",
         "pair "},
        {"agent --delay -1", "--delay: \"-1\" is no number from 0 to 9999", "agent "},
        {"name "s + headset + " --timeout soon", "--timeout: \"soon\" is no time such as 10 or 0.5",
         ""},
    };
    for (const auto& [arguments, mistake, verb] : wrong)
        EXPECT_EQ(failure(arguments, 2), mistake + "; see: kesbt " + verb + "--help\n");
}

TEST(Usage, ANarrowTerminalBreaksLinesBetweenWords) {
    const auto words = [](const std::string& text) {
        std::istringstream stream(text);
        return Texts{std::istream_iterator<std::string>(stream), {}};
    };
    for (const char* command :
         {"--help", "agent --help", "adapter set --help", "adapters", "adapter"}) {
        for (const std::size_t width : {std::size_t{40}, std::size_t{60}}) {
            const std::string line = KESBT " "s + command;
            std::string script(line);
            script.append(width == 60 ? ";COLUMNS=60 " : ";").append(line).append(" >&2");
            ChildProcess both({BLUEZ4_SIM, "--", "sh", "-c", script},
                              ChildProcess::Output::Terminal, {"NO_COLOR=1"});
            const auto [status, wide, narrow] = both.finish();
            EXPECT_EQ(words(wide), words(narrow));
            EXPECT_LE(wide.find('\n'), 80U);
            std::istringstream lines(narrow);
            for (std::string one; std::getline(lines, one);)
                EXPECT_TRUE(one.size() <= width || words(one).size() == 1 || // cannot be broken
                            one.rfind("  kesbt ", 0) == 0)                   // or is an example
                    << one;
        }
    }
}

TEST(Usage, ResultsThatCannotBeWrittenAreAFailureAndGoNowhereElse) {
    EXPECT_EQ(run("--version"), (Result{0, "kesbt " KESBT_VERSION "\n", ""}));
    EXPECT_EQ(runShell(KESBT " --help >/dev/full"),
              (Result{1, "",
                      "cannot write the results: No space left on device; check where "
                      "standard output goes\n"}));
    const PrivateBus bus(PrivateBus::Kind::System);
    EXPECT_EQ(runShell(KESBT " names >&-"),
              (Result{1, "", "standard output is closed; give results somewhere to go\n"}));
}

TEST(Usage, WithoutASystemBusTheLineSaysSo) {
    PrivateBus::address(PrivateBus::Kind::System); // where none runs
    for (const char* arguments : {"names", "adapters", "monitor", "agent --yes"})
        EXPECT_EQ(failure(arguments), "the system bus cannot be reached; start dbus-daemon, or "
                                      "try: bluez4-sim -- kesbt adapters\n");
}

TEST(Usage, WithoutADaemonOrWithAnotherTheLineSaysSo) {
    const PrivateBus bus(PrivateBus::Kind::System);
    for (const char* arguments :
         {"adapters", "adapter set Powered on", "devices", "device 00:11:22:33:44:06",
          "create 00:11:22:33:44:06", "remove 00:11:22:33:44:06", "services 00:11:22:33:44:06",
          "discover", "monitor", "cancel 00:11:22:33:44:06", "agent --yes",
          "audio connect 00:11:22:33:44:06", "volume up 00:11:22:33:44:06", "scan list",
          "autoconnect targets"})
        EXPECT_EQ(failure(arguments), absentDaemon);
    EXPECT_EQ(run("names").out.substr(0, 21), "org.freedesktop.DBus\n");

    RawPeer newer(bus.address(), "org.bluez");
    for (const char* method : {"DefaultAdapter", "ListAdapters"})
        newer.replyError(method, DBUS_ERROR_UNKNOWN_METHOD,
                         "Method \"DefaultAdapter\" with signature \"\" on interface "
                         "\"org.bluez.Manager\" doesn't exist\n");
    for (const char* verb : {"adapters", "devices"})
        EXPECT_EQ(failure(verb), "the bluetoothd on the system bus is not one of BlueZ 4; install "
                                 "that, or try: bluez4-sim -- kesbt adapters\n");
}

TEST(Usage, TheSimulatedDaemonRunsItAndPassesItsStatusOn) {
    const Result result = runShell(BLUEZ4_SIM " -- " KESBT " adapters");
    EXPECT_EQ(result, (Result{0,
                              "ADAPTER  ADDRESS            POWERED  DISCOVERABLE  DEFAULT  NAME\n"
                              "hci0     00:1A:7D:DA:71:10  yes      no            yes      "
                              "kestrine-0\n"
                              "hci1     00:1A:7D:DA:71:11  yes      no            no       "
                              "kestrine-1\n",
                              ""}));
    EXPECT_EQ(runShell(BLUEZ4_SIM " -- " KESBT " --adapter hci7 devices").status, 1);
}

} // namespace Bluetooth::Test
