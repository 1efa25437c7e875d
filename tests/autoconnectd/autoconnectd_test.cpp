// SPDX-License-Identifier: LGPL-2.1-or-later
// The auto-connect daemon in its own process.

#include "support/auto_connect_fixture.h"

#include <bluetooth/adapter.h>
#include <bluetooth/manager.h>

#include <signal.h>
#include <sys/file.h>

#include <functional>
#include <iterator>
#include <memory>

namespace Bluetooth::Test {

namespace {

using namespace std::string_literals;

constexpr const char* pidFile = "/tmp/test.pid";

Texts commandLine(const std::string& arguments, const char* file = pidFile, const char* by = "") {
    return {"sh", "-c",
            "exec "s + by + " " KESBT_AUTOCONNECTD " --pid-file " + file + " " + arguments +
                " 2>&1"};
}

/// What a daemon said that ended by itself with this status.
std::string outputOf(const Texts& command, int status = 1) {
    ChildProcess daemon(command, ChildProcess::Output::Capture);
    EXPECT_EQ(daemon.wait(), status);
    return daemon.readAll();
}

/// A daemon in the foreground, and its log.
struct Daemon : ChildProcess {
    explicit Daemon(const std::string& arguments = "--interval 1 --max-interval 1")
        : Daemon(commandLine("--foreground " + arguments)) {}
    explicit Daemon(const Texts& command) : ChildProcess(command, Output::Capture) {}
    ~Daemon() {
        if (!hasEnded()) {
            EXPECT_EQ(stop(), 0);
        }
        for (const std::string& line : passed)
            EXPECT_EQ(line.find(".cpp:"), std::string::npos) << "for programmers: " << line;
    }

    /// @return whether a line has come that begins so; lines before it are passed over
    bool waitFor(const std::string& text, Milliseconds limit = patience) {
        do {
            const std::string line = readLine(limit);
            if (line.empty())
                return false;
            passed.push_back(line.substr(line.find(": ") + 2)); // "kesbt-autoconnectd[5]: "
        } while (passed.back().rfind(text, 0) != 0);
        return true;
    }
    /// Ends it. @return its exit status
    int stop(int signal = SIGTERM) {
        this->signal(signal);
        return wait();
    }
    /// How often a line has been passed so far.
    long count(const std::string& text) const {
        return std::count(passed.begin(), passed.end(), text);
    }

    long residentKiB() const {
        long pages = 0;
        std::ifstream("/proc/" + std::to_string(pid()) + "/statm") >> pages >> pages;
        return pages * sysconf(_SC_PAGESIZE) / 1024;
    }

    Texts passed;
};

/// What the unit file of the service says under a key.
std::string serviceSetting(const std::string& key) {
    const std::string unit = readFile(KESBT_AUTOCONNECTD_SERVICE);
    const std::size_t begin = unit.find("\n" + key + "=");
    EXPECT_NE(begin, std::string::npos) << key;
    const std::size_t value = unit.find('=', begin) + 1;
    return unit.substr(value, unit.find('\n', value) - value);
}

Texts split(const std::string& text) {
    std::istringstream words(text);
    return {std::istream_iterator<std::string>(words), {}};
}

using Clock = std::chrono::steady_clock;
using Moment = Clock::time_point;

std::size_t wholeSecondsSince(Moment start) {
    const auto seconds = std::chrono::ceil<std::chrono::seconds>(Clock::now() - start);
    return static_cast<std::size_t>(seconds.count());
}

bool isOwnPipe() {
    struct stat status {};
    return lstat(commandPipe, &status) == 0 && status.st_mode == (S_IFIFO | 0600) &&
           status.st_uid == geteuid();
}

constexpr uid_t otherUser = 1000;

std::string audioOf(const char* device) {
    return "audio of "s + device;
}

} // namespace

class AutoConnectDaemonTest : public AutoConnectFixture {
protected:
    std::size_t connectCalls(const char* interface) {
        return simulation.countCalls("s:org.bluez."s + interface + " s:Connect ");
    }
    /// How often the daemon has read the files: each time it lists the adapters twice.
    std::size_t reloads() { return simulation.countCalls("s:ListAdapters ") / 2; }
    void setPower(const std::string& adapter, bool isOn) {
        EXPECT_TRUE(simulation.peer()
                        .call("org.bluez", adapter, "org.bluez.Adapter", "SetProperty",
                              with("Powered", Var{isOn}))
                        .get());
    }
    std::string pathOf(const char* adapter) {
        return std::unique_ptr<Adapter>(Manager().findAdapter(adapter))->getPath();
    }

    const std::string headsetConnected = audioOf(headset) + " connected";
};

TEST_F(AutoConnectDaemonTest, ConnectsAtStartBySinkOrAllAudioAndInput) {
    setConfig(adapter0, "1,"s + headset + "," + carKit + "," + keyboard);
    setConfig(adapter1, "1,"s + otherDevice);
    Daemon daemon;
    for (const std::string& target : {audioOf(headset), audioOf(carKit), audioOf(otherDevice),
                                      "input of "s + keyboard, "input of "s + otherDevice}) {
        const std::string connected = target + " connected";
        EXPECT_TRUE(daemon.count(connected) || daemon.waitFor(connected)) << target;
    }
    EXPECT_EQ(connectCalls("Input"), 2u) << "not for a headset's buttons";
    EXPECT_EQ(connectCalls("AudioSink"), 2u);
    EXPECT_EQ(connectCalls("Audio"), 1u);
    EXPECT_EQ(daemon.stop(), 0);
    EXPECT_TRUE(daemon.waitFor("stopped"));
}

TEST_F(AutoConnectDaemonTest, ADeviceThatIsAwayIsConnectedWhenItAppears) {
    setConfig(adapter0, "1,"s + headset);
    simulation.setDevice(headset, "Connectable", false);
    Daemon daemon;
    EXPECT_TRUE(daemon.waitFor("connecting " + audioOf(headset)));
    simulation.setDevice(headset, "Connectable", true);
    EXPECT_TRUE(daemon.waitFor(headsetConnected));
    simulation.control("DropLink", with("hci0", headset));
    EXPECT_TRUE(daemon.waitFor(audioOf(headset) + " disconnected"));
    EXPECT_TRUE(daemon.waitFor(headsetConnected)) << "and again when it comes back";
    EXPECT_EQ(daemon.stop(SIGINT), 0);
}

TEST_F(AutoConnectDaemonTest, TheLogSaysWhatAPersonCanActOnEachThingOnce) {
    const std::string silent = audioOf(carKit);
    setConfig(adapter0, "1,"s + carKit + "," + phone + "," + stranger);
    std::filesystem::create_directory(configFolder + std::string(adapter1));
    simulation.setDevice(carKit, "Connectable", false);
    {
        Daemon daemon("--interval 3600");
        EXPECT_TRUE(daemon.waitFor("removed \""s + stranger + "\" from the list of " + adapter0));
        EXPECT_TRUE(daemon.waitFor(silent + " cannot be connected (Connect Failed; make sure "));
        const std::string summary = silent + " is still not connected after ";
        for (const char* attempts : {"4 failed attempts since ", "8 failed attempts since "}) {
            do
                EXPECT_TRUE(autoConnect.reload());
            while (!daemon.waitFor(summary, Milliseconds(100)));
            EXPECT_EQ(daemon.passed.back().rfind(summary + attempts, 0), 0u)
                << daemon.passed.back();
        }
        simulation.setDevice(carKit, "Connectable", true);
        EXPECT_TRUE(autoConnect.reload());
        EXPECT_TRUE(daemon.waitFor(silent + " connected after "));
        const auto beginWith = [&](const std::string& text) {
            return std::count_if(daemon.passed.begin(), daemon.passed.end(),
                                 [&](const std::string& line) { return line.rfind(text, 0) == 0; });
        };
        EXPECT_EQ(beginWith(silent + " cannot"), 1);
        EXPECT_EQ(beginWith(phone + " is not connected: it is no headset"s), 1);
        EXPECT_EQ(beginWith("the list "s + configFolder + adapter1 + " is not used: make it"), 1);
    }
    Daemon verbose("--verbose");
    EXPECT_TRUE(verbose.waitFor("auto_connect.cpp:"))
        << "what the library says is there if asked for";
    verbose.passed.clear();
}

TEST_F(AutoConnectDaemonTest, CommandsThatRunTogetherAreCarriedOutInOrder) {
    Daemon daemon;
    ASSERT_TRUE(daemon.waitFor("started"));
    EXPECT_TRUE(autoConnect.sendCommand("pause1pauseresumexpause"));
    EXPECT_TRUE(daemon.waitFor("no command: \"x\""));
    for (const char* line : {"paused", "paused", "resumed", "paused"})
        EXPECT_TRUE(daemon.waitFor(line));

    EXPECT_TRUE(autoConnect.set(adapter0, true, (","s + headset).c_str()));
    EXPECT_TRUE(daemon.waitFor("watching " + audioOf(headset)))
        << "files are read while it pauses ...";
    EXPECT_FALSE(daemon.waitFor("connecting " + audioOf(headset), Milliseconds(1500)));
    EXPECT_EQ(connectCalls("AudioSink"), 0u) << "... and nothing is connected";
    EXPECT_TRUE(autoConnect.resume());
    EXPECT_TRUE(daemon.waitFor(headsetConnected));
}

TEST_F(AutoConnectDaemonTest, EveryCommandOfManySendersArrivesAlsoThroughAPipeMadeAnew) {
    Daemon daemon("--interval 3600"); // its own business does not wake it
    ASSERT_TRUE(daemon.waitFor("started"));
    constexpr int senders = 4;
    constexpr int each = 50;
    inThreads(senders, [](int) {
        for (int count = 0; count < each; ++count)
            EXPECT_TRUE(AutoConnect().pause());
    });
    EXPECT_TRUE(autoConnect.resume());
    EXPECT_TRUE(daemon.waitFor("resumed"));
    EXPECT_EQ(daemon.count("paused"), senders * each);

    std::filesystem::remove(commandPipe);
    ASSERT_TRUE(becomesTrue([] { return std::filesystem::is_fifo(commandPipe); }));
    ASSERT_TRUE(becomesTrue([this] { return autoConnect.pause(); })) << "made, and opened";
    EXPECT_TRUE(daemon.waitFor("paused"));
}

TEST_F(AutoConnectDaemonTest, ThePipeIsItsOwnWhateverStandsInItsPlace) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root takes away what others have made";
    writeFile("/tmp/secret", "secret");
    const std::function<void(const char*)> places[] = {
        [](const char* path) { std::filesystem::create_symlink("/tmp/secret", path); },
        [](const char* path) { writeFile(path, ""); },
        [](const char* path) {
            std::filesystem::create_directory(path);
            writeFile(path + "/file"s, "");
        },
        [](const char* path) { EXPECT_EQ(mkfifo(path, 0644), 0); }, // whom it is open to locks it
        [](const char* path) {
            EXPECT_EQ(mkfifo(path, 0600), 0);
            EXPECT_EQ(chown(path, otherUser, otherUser), 0);
        },
    };
    for (const auto& occupy : places) {
        std::filesystem::remove(commandPipe);
        occupy(commandPipe);
        const int held = open(commandPipe, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        EXPECT_EQ(flock(held, LOCK_EX | LOCK_NB), 0);
        Daemon daemon("--interval 3600");
        ASSERT_TRUE(daemon.waitFor("started"));
        EXPECT_TRUE(isOwnPipe());
        EXPECT_TRUE(autoConnect.pause());
        EXPECT_TRUE(daemon.waitFor("paused"));

        occupy("/tmp/other");
        std::error_code error;
        do { // until a folder finds the place empty: the daemon may be quicker
            if (std::filesystem::is_directory("/tmp/other"))
                std::filesystem::remove(commandPipe);
            std::filesystem::rename("/tmp/other", commandPipe, error);
        } while (error);
        EXPECT_TRUE(becomesTrue(isOwnPipe)) << "noticed although nothing else happens";
        EXPECT_TRUE(autoConnect.resume());
        EXPECT_TRUE(daemon.waitFor("resumed"));
        close(held);
    }
    EXPECT_EQ(readFile("/tmp/secret"), "secret");
}

TEST_F(AutoConnectDaemonTest, RubbishCostsALineASecondAndNoCommandAfterIt) {
    Daemon daemon;
    ASSERT_TRUE(daemon.waitFor("started"));
    const long before = daemon.residentKiB();
    const Moment start = Clock::now();
    std::string rubbish = "\033[2J\n\xff";
    while (rubbish.size() < 10'000'000)
        rubbish += rubbish;
    writeFile(commandPipe, rubbish + "pause");
    ASSERT_TRUE(daemon.waitFor("paused"));
    EXPECT_LE(daemon.passed.size(), wholeSecondsSince(start) + 3);
    ASSERT_GE(daemon.passed.size(), 3u);
    EXPECT_EQ(daemon.passed[1].find("no command: \"\\x1B[2J\\xFF\\x1B"), 0u) << daemon.passed[1];
    EXPECT_LT(daemon.passed[1].size(), 300u);
    if (!isSanitized) {
        EXPECT_LT(daemon.residentKiB() - before, 1024);
    }
}

TEST_F(AutoConnectDaemonTest, FollowsTheBluetoothDaemonAndItsAdapters) {
    setConfig(adapter0, "1,"s + headset);
    simulation.control("DropName");
    Daemon daemon("--interval 1");
    EXPECT_TRUE(daemon.waitFor("bluetoothd is not running; waiting for it"));
    simulation.control("RegainName");
    EXPECT_TRUE(daemon.waitFor(headsetConnected));

    setConfig(adapter0, "0");
    setConfig(adapter1, "1,"s + otherDevice);
    simulation.control("RemoveAdapter", with("hci1"));
    EXPECT_TRUE(autoConnect.reload());
    simulation.control("Restart"); // every path is new
    simulation.control("AddAdapter", [](Writer& w) {
        w.dict("sv", [](Writer& e) { e.entry("Address", Var{std::string(adapter1)}); });
    });
    EXPECT_TRUE(daemon.waitFor(audioOf(otherDevice) + " connected"));
}

TEST_F(AutoConnectDaemonTest, HoweverManySignalsComeADeviceIsTriedOncePerInterval) {
    setConfig(adapter0, "1,"s + headset + "," + stranger);
    simulation.setDevice(headset, "Connectable", false);
    const std::string hci0 = pathOf(adapter0);
    Daemon daemon("--interval 60");
    ASSERT_TRUE(daemon.waitFor("connecting " + audioOf(headset)));
    EXPECT_TRUE(simulation.awaitCalls("s:ListAdapters ", 4)) << "again, for it has pruned the list";
    const std::size_t before = reloads();
    for (int count = 0; count < 2000; ++count) {
        simulation.peer().emit("/", "org.bluez.Manager", "AdapterAdded", with(Path{hci0}));
        simulation.peer().emit(hci0, "org.bluez.Adapter", "PropertyChanged",
                               with("Powered", Var{false}));
    }
    const auto awaitLoop = [&](const char* text) { // a second after the last time
        EXPECT_TRUE(autoConnect.sendCommand(text));
        EXPECT_TRUE(daemon.waitFor("no command: \""s + text + "\""));
    };
    for (const char* text : {"x", "y", "z"})
        awaitLoop(text);
    EXPECT_EQ(reloads(), before) << "forged signals are nothing to it";

    const Moment start = Clock::now();
    for (int count = 0; count < 100; ++count)
        setPower(hci0, count % 2 != 0);
    setPower(hci0, false);
    EXPECT_TRUE(becomesTrue([&, seen = reloads()] { return reloads() > seen; }));
    awaitLoop("off");
    setConfig(adapter0, "1,"s + headset + "," + carKit);
    setPower(hci0, true);
    EXPECT_TRUE(daemon.waitFor(audioOf(carKit) + " connected")) << "not tried before: at once";
    EXPECT_GE(daemon.count("watching " + audioOf(headset)), 2) << "its target was made anew";
    EXPECT_LE(reloads() - before, wholeSecondsSince(start) + 1);
    EXPECT_EQ(simulation.countCalls("44_01 s:org.bluez.AudioSink s:Connect "), 1u);
}

TEST_F(AutoConnectDaemonTest, EndsInTimeWhateverHangs) {
    setConfig(adapter0, "1,"s + headset);
    for (const bool isTool : {true, false}) {
        writeProgram("/usr/bin/hciconfig", isTool ? "echo $$ > /tmp/hangs; exec sleep 60" : "");
        simulation.process().signal(isTool ? SIGCONT : SIGSTOP);
        Daemon daemon;
        ASSERT_TRUE(daemon.waitFor("started"));
        EXPECT_TRUE(!isTool || becomesTrue([] { return !readFile("/tmp/hangs").empty(); }));
        const Moment start = Clock::now();
        EXPECT_EQ(daemon.stop(isTool ? SIGINT : SIGTERM), 0) << isTool;
        EXPECT_LT(Clock::now() - start, std::chrono::seconds(2)) << isTool;
        const std::string tool = "/proc/" + std::to_string(std::stoi(readFile("/tmp/hangs")));
        EXPECT_TRUE(becomesTrue([&] { return readFile(tool + "/cmdline").empty(); })) << "it stays";
    }
    simulation.process().signal(SIGCONT);
    EXPECT_TRUE(Daemon().waitFor(headsetConnected)) << "nothing is left locked";
}

TEST_F(AutoConnectDaemonTest, WorksWithinTheLimitsOfItsService) {
    const std::string runtime = "/run/" + serviceSetting("RuntimeDirectory");
    std::filesystem::create_directory(runtime);
    Texts writable = split(serviceSetting("ReadWritePaths"));
    writable.push_back(runtime);
    std::ostringstream limits;
    limits << "bwrap --die-with-parent --ro-bind / / --dev /dev --proc /proc --unshare-net "
              "--unshare-ipc --cap-drop ALL";
    for (const std::string& name : split(serviceSetting("CapabilityBoundingSet")))
        limits << " --cap-add " << name;
    for (const std::string& path : writable) {
        const std::string place = path.substr(path.find('/'));
        limits << " --bind " << place << ' ' << place;
    }
    const std::string start = serviceSetting("ExecStart");
    setConfig(adapter0, "1,"s + headset + "," + stranger);
    writeFile(commandPipe, "");
    if (geteuid() == 0) {
        EXPECT_EQ(chown((std::string(configFolder) + adapter0).c_str(), otherUser, otherUser), 0);
    } else {
        std::filesystem::remove(commandPipe);
    }
    Daemon daemon({"sh", "-c",
                   "exec " + limits.str() + " " KESBT_AUTOCONNECTD " --foreground" +
                       start.substr(start.find(' ')) + " 2>&1"});
    EXPECT_TRUE(daemon.waitFor(headsetConnected));
    EXPECT_EQ(config(adapter0), "1,"s + headset);
    EXPECT_TRUE(autoConnect.pause());
    EXPECT_TRUE(daemon.waitFor("paused"));
    EXPECT_EQ(kill(std::stoi(readFile(serviceSetting("PIDFile"))), SIGTERM), 0);
    EXPECT_EQ(daemon.wait(), 0);
}

TEST_F(AutoConnectDaemonTest, GoesIntoTheBackgroundOnceItIsReady) {
    // The file is taken from the folder it is started in, not from the one it goes to.
    EXPECT_EQ(
        outputOf({"sh", "-c", "cd /tmp && exec " KESBT_AUTOCONNECTD " --pid-file test.pid <&-"}, 0),
        "")
        << "the output is let go of";
    const int pid = std::stoi(readFile(pidFile));
    EXPECT_TRUE(autoConnect.reload()) << "it listens";
    EXPECT_EQ(outputOf(commandLine("", "/tmp/other.pid")),
              "kesbt-autoconnectd: another kesbt-autoconnectd reads "
              "/tmp/kes_bluetooth_autoconnect; stop it first\n");
    EXPECT_EQ(outputOf(commandLine("")),
              "kesbt-autoconnectd: already running (/tmp/test.pid is locked); stop the other one, "
              "or choose another file with --pid-file\n");
    EXPECT_EQ(kill(pid, SIGTERM), 0);
    EXPECT_TRUE(
        becomesTrue([&] { return !std::filesystem::exists("/proc/" + std::to_string(pid)); }));
    EXPECT_EQ(readFile(pidFile), std::to_string(pid) + "\n");
}

TEST_F(AutoConnectDaemonTest, AFailedStartIsOneLineThatSaysWhatToDo) {
    const std::string name = "kesbt-autoconnectd: ";
    for (const char* mode : {"--foreground", ""}) {
        EXPECT_EQ(outputOf(commandLine(mode, "/nowhere/x")),
                  name + "cannot write /nowhere/x: No such file or directory; run as root, or "
                         "choose another file with --pid-file\n");
    }
    writeFile(commandPipe, "a file");
    const char* const asOther = geteuid() == 0 ? "unshare --user --map-user=1000" : "";
    EXPECT_EQ(outputOf(commandLine("", "/tmp/other.pid", asOther)),
              name + "cannot replace /tmp/kes_bluetooth_autoconnect, which is no pipe of this "
                     "user's own: Operation not permitted; remove it and start again\n");
    std::filesystem::remove(commandPipe);
    simulation.bus().kill();
    EXPECT_EQ(outputOf(commandLine("-f")),
              name + "cannot reach the system bus; start dbus-daemon, or set "
                     "DBUS_SYSTEM_BUS_ADDRESS\n");
    for (const char* wrong : {"--interval 0", "--max-interval x", "--unknown", "word"}) {
        const std::string text = outputOf(commandLine(wrong), 2);
        EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 1) << text;
    }
    for (const char* right : {"--help", "--version"})
        outputOf(commandLine(right), 0);
}

TEST_F(AutoConnectDaemonTest, EndsWhenTheBusGoes) {
    Daemon daemon;
    ASSERT_TRUE(daemon.waitFor("started"));
    simulation.bus().kill();
    const char* const reason = "the system bus has gone; start again when it is back";
    EXPECT_TRUE(daemon.waitFor(reason));
    EXPECT_EQ(daemon.stop(0), 1);
    EXPECT_FALSE(daemon.waitFor("a line after that"));
    EXPECT_EQ(daemon.count(reason), 1) << "one line, not one more from the log";
}

} // namespace Bluetooth::Test
