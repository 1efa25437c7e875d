// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_TESTS_DEVICES_H
#define KESBLUETOOTH_TESTS_DEVICES_H

namespace Bluetooth::Test {

// The adapters of the scenarios.
inline constexpr const char* adapter0 = "00:1A:7D:DA:71:10";
inline constexpr const char* adapter1 = "00:1A:7D:DA:71:11";

// The devices of sim/scenarios/default.conf, which defines them, named by how they behave.
inline constexpr const char* headset = "00:11:22:33:44:01";  // pairs unasked; audio sink, control
inline constexpr const char* keyboard = "00:11:22:33:44:02"; // our passkey is typed on it
inline constexpr const char* phone = "00:11:22:33:44:03";    // both sides confirm a passkey
inline constexpr const char* pinReceiver = "00:11:22:33:44:04"; // asks for the PIN 1234
inline constexpr const char* vanishingSpeaker = "00:11:22:33:44:05";
inline constexpr const char* knownMouse = "00:11:22:33:44:06";        // paired with hci0
inline constexpr const char* unreachableLaptop = "00:11:22:33:44:07"; // seen, does not answer
inline constexpr const char* carKit = "00:11:22:33:44:08";            // we enter its passkey 424242

// In no scenario: the tests that use these add them.
inline constexpr const char* newDevice = "00:11:22:33:44:55"; // behaves as its test says
inline constexpr const char* otherDevice = "00:11:22:33:44:66";
inline constexpr const char* silentDevice = "00:11:22:33:44:99"; // leaves a pairing unanswered

} // namespace Bluetooth::Test

#endif
