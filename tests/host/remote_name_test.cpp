// SPDX-License-Identifier: LGPL-2.1-or-later
#include <bluetooth/commandlib.h>

#include <bluetooth/bluetooth.h>
#include <bluetooth/hci.h>
#include <bluetooth/hci_lib.h>
#include <gtest/gtest.h>

#include "support/latch.h"

#include <tuple>

namespace {

/// What the controller does, and what it was asked.
struct FakeController {
    int route = 3;
    int device = 55;
    int result = 0;
    std::string name;

    std::vector<std::string> calls;
};

FakeController controller;

std::string textOf(const bdaddr_t* address) {
    char text[18];
    ba2str(address, text);
    return text;
}

} // namespace

// In the place of libbluetooth's.
extern "C" {

int hci_get_route(bdaddr_t* bdaddr) {
    controller.calls.push_back("route " + textOf(bdaddr));
    return controller.route;
}

int hci_open_dev(int dev_id) {
    controller.calls.push_back("open " + std::to_string(dev_id));
    return controller.device;
}

int hci_close_dev(int dd) {
    controller.calls.push_back("close " + std::to_string(dd));
    return 0;
}

int hci_read_remote_name(int dd, const bdaddr_t* bdaddr, int len, char* name, int to) {
    controller.calls.push_back("name " + std::to_string(dd) + " " + textOf(bdaddr) + " " +
                               std::to_string(len) + " " + std::to_string(to));
    // As a controller may: all the bytes there is room for, and no terminator.
    controller.name.copy(name, 248);
    return controller.result;
}
}

namespace Bluetooth::Test {

namespace {

/// @return the buffer after a look-up, which held 300 times x before; "" when it failed
std::string lookUp(int size, const char* address = "00:11:22:aa:BB:CC") {
    const std::string before(300, 'x');
    std::string buffer = before;
    const int result =
        getNameFromAddr(address, buffer.data(), size, static_cast<GetNameTimeout>(1234));
    if (result == 0)
        return buffer;
    EXPECT_EQ(result, -1);
    EXPECT_EQ(buffer, before);
    return "";
}

} // namespace

TEST(RemoteNameTest, AsksTheRoutingAdapterAndCutsTheName) {
    controller.name = "Headset";
    EXPECT_STREQ(lookUp(32).c_str(), "Headset");
    EXPECT_EQ(controller.calls, (Texts{"route 00:11:22:AA:BB:CC", "open 3",
                                       "name 55 00:11:22:AA:BB:CC 248 1234", "close 55"}));
    // A name of the full length has no terminator of its own.
    controller.name = std::string(500, 'n');
    for (const auto& [size, length] :
         {std::pair(1, 0u), std::pair(4, 3u), std::pair(248, 247u), std::pair(300, 248u)})
        EXPECT_EQ(lookUp(size), std::string(length, 'n') + '\0' + std::string(299 - length, 'x'));
}

TEST(RemoteNameTest, FailureClosesWhatWasOpened) {
    for (const auto& [route, device, lastCall] :
         {std::tuple(3, 55, "close 55"), std::tuple(3, -1, "open 3"),
          std::tuple(-1, 55, "route 00:11:22:AA:BB:CC")}) {
        controller = {route, device, -1, "half a name", {}};
        EXPECT_EQ(lookUp(300), "");
        EXPECT_EQ(controller.calls.back(), lastCall);
    }
}

TEST(RemoteNameTest, UnusableArgumentsReachNoController) {
    controller = {};
    EXPECT_EQ(getNameFromAddr("00:11:22:aa:BB:CC", nullptr, 8, GET_NAME_TIMEOUT_DEFAULT), -1);
    for (const int size : {0, -1})
        EXPECT_EQ(lookUp(size), "");
    for (const char* bad : {static_cast<const char*>(nullptr), "", "00:11:22", "00:11:22:33:44:5G",
                            "00-11-22-33-44-55"})
        EXPECT_EQ(lookUp(8, bad), "");
    EXPECT_EQ(controller.calls, Texts());
}

} // namespace Bluetooth::Test
