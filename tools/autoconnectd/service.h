// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_SERVICE_H
#define KESBT_AUTOCONNECTD_SERVICE_H

#include <memory>
#include <string>
#include <vector>

namespace Bluetooth {
class BluezObject;
} // namespace Bluetooth

namespace AutoConnectd {

/// What a device can be connected for, and the interface of the Bluetooth daemon for that.
struct Service {
    const char* name;      ///< for people
    const char* property;  ///< tells whether it is connected,
    const char* connected; ///< by this value, in the text form of dict_codec.h
    std::unique_ptr<Bluetooth::BluezObject> (*makeProxy)(const char* path);
};

/// The services to connect of a device with these UUIDs: its audio sink, or all its audio where it
/// has none, and its input. A headset's buttons are no input: they come with its audio.
/// @param uuids the device's property, in the text form of dict_codec.h
std::vector<const Service*> servicesOf(const std::string& uuids);

} // namespace AutoConnectd

#endif
