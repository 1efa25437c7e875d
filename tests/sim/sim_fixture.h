#ifndef KESBLUETOOTH_TESTS_SIM_SIM_FIXTURE_H
#define KESBLUETOOTH_TESTS_SIM_SIM_FIXTURE_H

#include "sim/sim_client.h"
#include "support/child_process.h"
#include "support/private_bus.h"

#include <gtest/gtest.h>

#include <csignal>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

namespace Bluetooth::Test {

/// The daemon on a bus of its own, with two adapters and no devices, at a hundredth of the times.
class SimTest : public testing::Test {
protected:
    SimTest() {
        std::ofstream(scenario) << "[Times]\nIdleDisconnect=4000000\n"
                                   "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\nName=first\n"
                                   "[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\nName=second\n";
        daemon = start();
        client = std::make_unique<SimClient>();
        base = client->base();
        adapter = base + "hci0";
    }

    /// Whatever happened, the daemon ends when asked, quietly: a sanitizer's findings show here.
    void TearDown() override {
        client.reset();
        if (daemon->hasEnded())
            return;
        daemon->signal(SIGTERM);
        EXPECT_EQ(daemon->wait(), 0);
        daemon->readAll();
        EXPECT_EQ(daemon->readErrors(), "");
    }

    std::unique_ptr<ChildProcess> start(const std::string& scale = "0.01") const {
        auto process = std::make_unique<ChildProcess>(
            std::vector<std::string>{BLUEZ4_SIM, "--print-ready", "--time-scale=" + scale,
                                     "--scenario=" + scenario},
            ChildProcess::Output::Capture,
            std::vector<std::string>{"G_SLICE=always-malloc"}); // else leaks hide in GLib's slabs
        if (process->readLine() != "ready")
            throw std::runtime_error("bluez4-sim does not start: " + process->readErrors());
        return process;
    }

    /// A device in range.
    /// @param settings  as GVariant text, e.g. "'Behaviour': <'LegacyPin'>"
    void addDevice(const std::string& address, const std::string& settings = "") {
        client->control("AddDevice", "('" + address + "', @a{sv} {" + settings + "})");
    }
    void setDevice(const std::string& address, const std::string& settings) {
        client->control("SetDevice", "('" + address + "', @a{sv} {" + settings + "})");
    }
    std::string createDevice(const std::string& address) {
        return client->call(adapter, "Adapter.CreateDevice", "('" + address + "',)");
    }
    std::string setProperty(const std::string& path, const std::string& interface,
                            const std::string& name, const std::string& value) {
        return client->call(path, interface + ".SetProperty", "('" + name + "', <" + value + ">)");
    }
    std::string devicePath(const std::string& address = "00_11_22_33_44_55") const {
        return adapter + "/dev_" + address;
    }

    const std::string scenario = testFolder() + "/scenario.conf";
    PrivateBus bus{PrivateBus::Kind::System};
    std::unique_ptr<ChildProcess> daemon;
    std::unique_ptr<SimClient> client;
    std::string base;
    std::string adapter;
};

inline constexpr const char* phone = "00:11:22:33:44:55";

} // namespace Bluetooth::Test

#endif
