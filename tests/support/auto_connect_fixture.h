// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_AUTO_CONNECT_FIXTURE_H
#define KESBLUETOOTH_TESTS_AUTO_CONNECT_FIXTURE_H

#include "support/devices.h"
#include "support/namespace_test.h"
#include "support/simulation.h"

#include <bluetooth/auto_connect.h>

namespace Bluetooth::Test {

inline constexpr const char* stranger = "DE:AD:BE:EF:00:01"; // known to none

/// The simulated daemon knows five devices: the headset and the other device have a sink, the other
/// device and the keyboard input, the car kit other audio and the phone nothing to connect; there
/// are no lists of devices to connect yet.
class AutoConnectFixture : public NamespaceTest {
protected:
    AutoConnectFixture() {
        simulation.watchCalls();
        // Adapters ask it for their version; it is missing here, and not what is tested.
        writeProgram("/usr/bin/hciconfig", "");
    }

    static void setConfig(const char* adapter, const std::string& content) {
        std::filesystem::create_directory(configFolder);
        writeFile(std::string(configFolder) + adapter, content);
    }
    static std::string config(const char* adapter) {
        return readFile(std::string(configFolder) + adapter);
    }

    Simulation simulation{
        "[Adapter hci0]\nAddress=00:1A:7D:DA:71:10\n[Adapter hci1]\nAddress=00:1A:7D:DA:71:11\n"
        "[Device 00:11:22:33:44:01]\nAdapter=hci0\nKnown=true\nUUIDs=110b;110e\n"
        "[Device 00:11:22:33:44:08]\nAdapter=hci0\nKnown=true\nUUIDs=1108;111e\n"
        "[Device 00:11:22:33:44:02]\nAdapter=hci0\nKnown=true\nUUIDs=1124\n"
        "[Device 00:11:22:33:44:03]\nAdapter=hci0\nKnown=true\nUUIDs=1105\n"
        "[Device 00:11:22:33:44:66]\nAdapter=hci1\nKnown=true\nUUIDs=110b;1124\n"};
    AutoConnect autoConnect;
};

} // namespace Bluetooth::Test

#endif
