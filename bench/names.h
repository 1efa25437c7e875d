// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_BENCH_NAMES_H
#define KESBLUETOOTH_BENCH_NAMES_H

namespace Bench {

/// The peer stands in for the Bluetooth daemon, so that the library's own proxies can be measured.
inline constexpr const char* peerName = "org.bluez";
inline constexpr const char* peerPath = "/org/bluez/1";
inline constexpr const char* peerInterface = "org.bluez.Adapter";

/// An adapter whose ListDevices has N devices has the path ADAPTERS + N.
inline constexpr const char* adapters = "/org/bluez/1/hci";

} // namespace Bench

#endif
