#include <bluetooth/commandlib.h>

#include <bluetooth/bluetooth.h>
#include <bluetooth/hci.h>
#include <bluetooth/hci_lib.h>
#include <gtest/gtest.h>

#include "support/latch.h"

#include <string>
#include <vector>

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

constexpr const char* address = "00:11:22:aa:BB:CC";

/// @return the buffer after a look-up, which held only "x" before
std::string lookUp(int size, int expected) {
    std::string buffer(300, 'x');
    EXPECT_EQ(getNameFromAddr(address, buffer.data(), size, GET_NAME_TIMEOUT_SHORT), expected);
    return buffer;
}

} // namespace

class RemoteNameTest : public ::testing::Test {
protected:
    RemoteNameTest() { controller = {}; }
};

TEST_F(RemoteNameTest, AsksTheRoutingAdapterAndCutsTheName) {
    controller.name = "Headset";
    char name[32];
    EXPECT_EQ(getNameFromAddr(address, name, sizeof name, static_cast<GetNameTimeout>(1234)), 0);
    EXPECT_STREQ(name, "Headset");
    EXPECT_EQ(controller.calls, (Texts{"route 00:11:22:AA:BB:CC", "open 3",
                                       "name 55 00:11:22:AA:BB:CC 248 1234", "close 55"}));
    controller.name = std::string(500, 'n');
    const std::string untouched(300, 'x');
    EXPECT_EQ(lookUp(1, 0), '\0' + untouched.substr(1));
    EXPECT_EQ(lookUp(4, 0), std::string("nnn\0", 4) + untouched.substr(4));
    EXPECT_EQ(lookUp(248, 0), std::string(247, 'n') + '\0' + untouched.substr(248));
    EXPECT_EQ(lookUp(300, 0), std::string(248, 'n') + '\0' + untouched.substr(249))
        << "a name of the full length has no terminator of its own";
}

TEST_F(RemoteNameTest, FailureLeavesTheBufferAndClosesWhatWasOpened) {
    controller.name = "half a name";
    const auto failsAfter = [](const std::string& lastCall) {
        controller.calls.clear();
        EXPECT_EQ(lookUp(300, -1), std::string(300, 'x'));
        EXPECT_EQ(controller.calls.back(), lastCall);
    };
    controller.result = -1;
    failsAfter("close 55");
    controller.device = -1;
    failsAfter("open 3");
    controller.route = -1;
    failsAfter("route 00:11:22:AA:BB:CC");
}

TEST_F(RemoteNameTest, UnusableArgumentsReachNoController) {
    char name[8] = "x";
    EXPECT_EQ(getNameFromAddr(nullptr, name, 8, GET_NAME_TIMEOUT_DEFAULT), -1);
    EXPECT_EQ(getNameFromAddr(address, nullptr, 8, GET_NAME_TIMEOUT_DEFAULT), -1);
    for (const int size : {0, -1})
        EXPECT_EQ(getNameFromAddr(address, name, size, GET_NAME_TIMEOUT_DEFAULT), -1);
    for (const char* bad : {"", "00:11:22", "00:11:22:33:44:5G", "00-11-22-33-44-55"})
        EXPECT_EQ(getNameFromAddr(bad, name, 8, GET_NAME_TIMEOUT_DEFAULT), -1);
    EXPECT_STREQ(name, "x");
    EXPECT_TRUE(controller.calls.empty());
}

} // namespace Bluetooth::Test
