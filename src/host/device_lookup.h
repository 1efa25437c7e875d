// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_HOST_DEVICE_LOOKUP_H
#define KESBLUETOOTH_HOST_DEVICE_LOOKUP_H

#include <string>

namespace Bluetooth {

class Adapter;
class DeviceList;

/// What the daemon says of an address. NotAnswered is anything but its own verdict: it hangs or
/// restarts, or the adapter was pulled out, which must not cost the user's list.
enum class Lookup { Found, Unknown, NotAnswered };

/// Appends the device of an address, when the adapter knows it.
/// @param address may hold any byte; what cannot be sent to the daemon is unknown to it
Lookup appendDevice(Adapter& adapter, const std::string& address, DeviceList& devices);

} // namespace Bluetooth

#endif
