#include "host/sim_test.h"

#include <bluetooth/auto_connect.h>
#include <bluetooth/commandlib.h>

#include <signal.h>
#include <sys/stat.h>

#include <memory>

namespace Bluetooth::Test {

namespace {

using namespace std::string_literals;
using Lines = std::vector<std::string>;

constexpr const char* pidFile = "/tmp/test.pid";

std::vector<std::string> commandLine(const std::string& arguments, const char* file = pidFile) {
    return {"sh", "-c",
            "exec " KESBT_AUTOCONNECTD " --pid-file "s + file + " " + arguments + " 2>&1"};
}

/// A daemon in the foreground, and its log.
class Daemon {
public:
    explicit Daemon(const std::string& arguments = "--interval 1")
        : m_process(commandLine("--foreground " + arguments), ChildProcess::Output::Capture) {}

    /// @return whether the line has come; lines before it are passed over
    bool waitFor(const std::string& text, Milliseconds limit = patience) {
        for (;;) {
            const std::string line = m_process.readLine(limit);
            if (line.empty())
                return false;
            m_log.push_back(line.substr(line.find(": ") + 2)); // "kesbt-autoconnectd[5]: "
            if (m_log.back() == text)
                return true;
        }
    }
    /// Ends it. @return its exit status
    int stop(int signal = SIGTERM) {
        m_process.signal(signal);
        return m_process.wait();
    }
    /// How often a line has been passed so far.
    long count(const std::string& text) const {
        return std::count(m_log.begin(), m_log.end(), text);
    }

private:
    ChildProcess m_process;
    Lines m_log;
};

} // namespace

class AutoConnectDaemonTest : public SimTest {
protected:
    void SetUp() override {
        SimTest::SetUp();
        setConfig(adapter0, "1,"s + headset + "," + carKit + "," + keyboard);
        setConfig(adapter1, "1,"s + speaker);
        other.addMatch("type='signal',member='CallReceived'");
        writeFile("/usr/bin/hciconfig", "#!/bin/sh\n");
        std::filesystem::permissions("/usr/bin/hciconfig", std::filesystem::perms::all);
    }

    /// The interfaces on which the daemon was told to connect.
    Lines connectCalls() {
        control("ClearFaults"); // answered after the signals that were under way
        Lines interfaces;
        for (const std::string& signal : other.signals().events()) {
            for (const char* interface : {"org.bluez.AudioSink", "org.bluez.Audio"}) {
                if (signal.find("s:"s + interface + " s:Connect ") != std::string::npos)
                    interfaces.push_back(interface);
            }
        }
        return interfaces;
    }
    void disconnect(const char* address) {
        control("DropLink", [&](Writer& w) { w("hci0")(address); });
    }

    AutoConnect commands;
    const std::string headsetConnected = headset + " connected"s;
};

TEST_F(AutoConnectDaemonTest, ConnectsAtStartBySinkOrAllAudio) {
    Daemon daemon;
    Lines connected;
    EXPECT_TRUE(daemon.waitFor(headsetConnected));
    EXPECT_TRUE(daemon.waitFor(carKit + " connected"s) || daemon.count(carKit + " connected"s));
    EXPECT_TRUE(daemon.count(speaker + " connected"s) || daemon.waitFor(speaker + " connected"s));
    EXPECT_EQ(connectCalls(),
              (Lines{"org.bluez.AudioSink", "org.bluez.Audio", "org.bluez.AudioSink"}));
    EXPECT_EQ(daemon.stop(), 0);
    daemon.waitFor("stopped");
    EXPECT_EQ(daemon.count("stopped"), 1);
}

TEST_F(AutoConnectDaemonTest, ADeviceThatIsAwayIsConnectedWhenItAppears) {
    setConfig(adapter0, "1,"s + headset);
    setConfig(adapter1, "0");
    setConnectable(headset, false);
    Daemon daemon;
    EXPECT_TRUE(daemon.waitFor("connecting "s + headset));
    setConnectable(headset, true);
    EXPECT_TRUE(daemon.waitFor(headsetConnected));
    disconnect(headset);
    EXPECT_TRUE(daemon.waitFor(headset + " disconnected"s));
    EXPECT_TRUE(daemon.waitFor(headsetConnected)) << "and again when it comes back";
    EXPECT_EQ(daemon.stop(SIGINT), 0);
}

TEST_F(AutoConnectDaemonTest, CommandsThatRunTogetherAreCarriedOutInOrder) {
    setConfig(adapter0, "0");
    setConfig(adapter1, "0");
    Daemon daemon("--interval 1 --max-interval 1");
    ASSERT_TRUE(daemon.waitFor("started"));
    EXPECT_TRUE(commands.sendCommand("pause1pauseresumexpause"));
    EXPECT_TRUE(daemon.waitFor("no command: \"x\""));
    for (const char* line : {"paused", "paused", "resumed", "paused"})
        EXPECT_TRUE(daemon.waitFor(line));

    EXPECT_TRUE(commands.set(adapter0, true, (","s + headset).c_str()));
    EXPECT_TRUE(daemon.waitFor("watching "s + headset)) << "files are read while it pauses ...";
    EXPECT_FALSE(daemon.waitFor("connecting "s + headset, Milliseconds(1500)));
    EXPECT_EQ(connectCalls(), Lines()) << "... and nothing is connected";
    EXPECT_TRUE(commands.resume());
    EXPECT_TRUE(daemon.waitFor(headsetConnected));
}

TEST_F(AutoConnectDaemonTest, EveryCommandOfManySendersArrives) {
    setConfig(adapter0, "0");
    setConfig(adapter1, "0");
    Daemon daemon;
    ASSERT_TRUE(daemon.waitFor("started"));
    constexpr int senders = 4;
    constexpr int each = 50;
    std::vector<std::thread> threads;
    threads.reserve(senders);
    for (int sender = 0; sender < senders; ++sender)
        threads.emplace_back([] {
            for (int count = 0; count < each; ++count)
                EXPECT_TRUE(AutoConnect().pause());
        });
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_TRUE(commands.resume());
    EXPECT_TRUE(daemon.waitFor("resumed"));
    EXPECT_EQ(daemon.count("paused"), senders * each);
}

TEST_F(AutoConnectDaemonTest, FollowsTheBluetoothDaemonAndItsAdapters) {
    control("DropName");
    Daemon daemon;
    EXPECT_TRUE(daemon.waitFor("bluetoothd is not running; waiting for it"));
    control("RegainName");
    EXPECT_TRUE(daemon.waitFor(headsetConnected));

    setConfig(adapter0, "0");
    setConfig(adapter1, "1,"s + speaker);
    control("RemoveAdapter", [](Writer& w) { w("hci1"); });
    EXPECT_TRUE(commands.reload());
    control("Restart"); // every path is new
    control("AddAdapter", [](Writer& w) {
        w.dict("sv", [](Writer& e) { e.entry("Address", Var{std::string(adapter1)}); });
    });
    EXPECT_TRUE(daemon.waitFor(speaker + " connected"s));
    EXPECT_EQ(daemon.stop(), 0);
}

TEST_F(AutoConnectDaemonTest, ARemovedPipeIsMadeAnew) {
    Daemon daemon("--interval 1 --max-interval 1");
    ASSERT_TRUE(daemon.waitFor("started"));
    std::filesystem::remove(commandPipe);
    while (!std::filesystem::is_fifo(commandPipe))
        usleep(10000);
    while (!commands.pause()) // made, and not yet opened
        usleep(1000);
    EXPECT_TRUE(daemon.waitFor("paused"));
}

TEST_F(AutoConnectDaemonTest, GoesIntoTheBackgroundOnceItIsReady) {
    // Taken from the folder it is started in, not from the one it goes to.
    ChildProcess starter({"sh", "-c", "cd /tmp && exec " KESBT_AUTOCONNECTD " --pid-file test.pid"},
                         ChildProcess::Output::Capture);
    EXPECT_EQ(starter.wait(), 0);
    EXPECT_EQ(starter.readAll(), "") << "the output is let go of";
    const int pid = std::stoi(readFile(pidFile));
    EXPECT_TRUE(commands.reload()) << "it listens";

    ChildProcess second(commandLine(""), ChildProcess::Output::Capture);
    EXPECT_EQ(second.wait(), 1);
    EXPECT_EQ(second.readAll(),
              "kesbt-autoconnectd: already running (/tmp/test.pid is locked); stop the other one, "
              "or choose another file with --pid-file\n");
    EXPECT_EQ(kill(pid, SIGTERM), 0);
    while (std::filesystem::exists("/proc/" + std::to_string(pid)))
        usleep(1000);
    EXPECT_EQ(readFile(pidFile), std::to_string(pid) + "\n");
}

TEST_F(AutoConnectDaemonTest, AFailedStartIsOneLineThatSaysWhatToDo) {
    writeFile(commandPipe, "a file");
    const struct {
        const char* pidFile;
        std::string line;
    } cases[] = {
        {"/nowhere/x", "cannot write /nowhere/x: No such file or directory; run as root, or choose "
                       "another file with --pid-file"},
        {pidFile, "/tmp/kes_bluetooth_autoconnect is not a pipe that can be read; remove it and "
                  "start again"},
    };
    for (const auto& testCase : cases) {
        for (const char* mode : {"--foreground", ""}) {
            ChildProcess daemon(commandLine(mode, testCase.pidFile), ChildProcess::Output::Capture);
            EXPECT_EQ(daemon.wait(), 1);
            EXPECT_EQ(daemon.readAll(), "kesbt-autoconnectd: " + testCase.line + "\n");
        }
    }
    std::filesystem::remove(commandPipe);
    bus.kill();
    ChildProcess alone(commandLine("-f"), ChildProcess::Output::Capture);
    EXPECT_EQ(alone.wait(), 1);
    EXPECT_EQ(alone.readAll(), "kesbt-autoconnectd: cannot reach the system bus; start "
                               "dbus-daemon, or set DBUS_SYSTEM_BUS_ADDRESS\n");
    for (const char* wrong : {"--interval 0", "--max-interval x", "--unknown", "word"}) {
        ChildProcess daemon(commandLine(wrong), ChildProcess::Output::Capture);
        EXPECT_EQ(daemon.wait(), 2);
        const std::string text = daemon.readAll();
        EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 1) << text;
    }
    for (const char* right : {"--help", "--version"})
        EXPECT_EQ(ChildProcess(commandLine(right), ChildProcess::Output::Capture).wait(), 0);
}

TEST_F(AutoConnectDaemonTest, EndsWhenTheBusGoes) {
    Daemon daemon("--interval 1 --max-interval 1");
    ASSERT_TRUE(daemon.waitFor("started"));
    bus.kill();
    const char* const reason = "the system bus has gone; start again when it is back";
    EXPECT_TRUE(daemon.waitFor(reason));
    EXPECT_EQ(daemon.stop(0), 1);
    EXPECT_FALSE(daemon.waitFor("a line after that"));
    EXPECT_EQ(daemon.count(reason), 1) << "one line, not one more from the log";
}

} // namespace Bluetooth::Test
