// What the program says before there is anything to do, and when nothing can be done.

#include "kesbt/kesbt_test.h"

namespace Bluetooth::Test {

TEST(Usage, WrongUsageIsOneLineThatSaysWhereToReadOnAndStatus2) {
    const std::vector<std::pair<Texts, std::string>> wrong = {
        {{}, "a verb is missing; see: kesbt --help\n"},
        {{"help"}, "there is no verb \"help\"; see: kesbt --help\n"},
        {{"adaptres"},
         "there is no verb \"adaptres\" (did you mean adapters?); see: kesbt --help\n"},
        {{"wait", "pared", headset},
         "there is no verb \"pared\" (did you mean paired?); see: kesbt wait --help\n"},
        {{"devices", "--timout=5"},
         "there is no option \"--timout=5\" (did you mean --timeout?); see: kesbt devices "
         "--help\n"},
        {{"devices", "too", "much"}, "\"too\" is too much; see: kesbt devices --help\n"},
        {{"audio"}, "a verb is missing; see: kesbt audio --help\n"},
        {{"audio", "play", headset}, "there is no verb \"play\"; see: kesbt audio --help\n"},
        {{"device"}, "ADDRESS is required; see: kesbt device --help\n"},
        {{"device", "00:11:22"},
         "ADDRESS: \"00:11:22\" is no address such as 00:11:22:33:44:55; see: kesbt device "
         "--help\n"},
        {{"--adapter", "/org/bluez/1/hci0", "devices"},
         "--adapter: \"/org/bluez/1/hci0\" is no adapter such as hci0; see: kesbt --help\n"},
        {{"discover", "--seconds", "0"},
         "--seconds: \"0\" is no time such as 10 or 0.5; see: kesbt discover --help\n"},
        {{"pair", headset, "--pin", "12345678901234567"},
         "--pin: a PIN has 1 to 16 characters; see: kesbt pair --help\n"},
        {{"pair", headset, "--capability", "Telepathy"},
         "--capability: \"Telepathy\" is none of DisplayYesNo, DisplayOnly, KeyboardOnly, "
         "NoInputNoOutput; see: kesbt pair --help\n"},
        {{"agent", "--delay", "-1"},
         "--delay: \"-1\" is no number from 0 to 9999; see: kesbt agent --help\n"},
        {{"name", headset, "--timeout", "soon"},
         "--timeout: \"soon\" is no time such as 5000; see: kesbt name --help\n"},
    };
    for (const auto& [arguments, line] : wrong)
        EXPECT_EQ(failure(arguments, 2), line);
}

TEST(Usage, ResultsThatCannotBeWrittenAreAFailureAndGoNowhereElse) {
    EXPECT_EQ(run({"--version"}), (Result{0, "kesbt " KESBT_VERSION "\n", ""}));
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
    for (const Texts& arguments :
         {Texts{"names"}, Texts{"adapters"}, Texts{"monitor"}, Texts{"agent"}})
        EXPECT_EQ(failure(arguments), "the system bus cannot be reached; start dbus-daemon, or "
                                      "try: bluez4-sim -- kesbt adapters\n");
}

TEST(Usage, WithoutADaemonOrWithAnotherTheLineSaysSo) {
    const PrivateBus bus(PrivateBus::Kind::System);
    for (const Texts& arguments :
         {Texts{"adapters"}, Texts{"adapter", "set", "Powered", "on"}, Texts{"devices"},
          Texts{"device", knownMouse}, Texts{"create", headset}, Texts{"remove", knownMouse},
          Texts{"services", knownMouse}, Texts{"discover"}, Texts{"monitor"},
          Texts{"cancel", headset}, Texts{"agent"}, Texts{"audio", "connect", headset},
          Texts{"volume", "up", headset}, Texts{"scan", "list"}, Texts{"autoconnect", "targets"}})
        EXPECT_EQ(failure(arguments), absentDaemon);
    EXPECT_EQ(run({"names"}).out.substr(0, 21), "org.freedesktop.DBus\n");

    RawPeer newer(bus.address(), "org.bluez");
    for (const char* method : {"DefaultAdapter", "ListAdapters"})
        newer.replyError(method, DBUS_ERROR_UNKNOWN_METHOD,
                         "Method \"DefaultAdapter\" with signature \"\" on interface "
                         "\"org.bluez.Manager\" doesn't exist\n");
    for (const char* verb : {"adapters", "devices"})
        EXPECT_EQ(failure({verb}),
                  "the bluetoothd on the system bus is not one of BlueZ 4; install "
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
