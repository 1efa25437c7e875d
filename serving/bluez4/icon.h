// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_SERVING_BLUEZ4_ICON_H
#define KESBLUETOOTH_SERVING_BLUEZ4_ICON_H

#include <glib.h>

#include <optional>

namespace Bluetooth::Serving {

/// The icon name of a class of device, or nothing for a class without one, or that is not known.
inline std::optional<const char*> iconOf(std::optional<guint32> deviceClass) {
    if (!deviceClass)
        return std::nullopt;
    const guint32 major = (*deviceClass >> 8) & 0x1f;
    const guint32 minor = (*deviceClass >> 2) & 0x3f;
    switch (major) {
    case 1:
        return "computer";
    case 2:
        return minor == 4 ? "modem" : "phone";
    case 3:
        return "network-wireless";
    case 4:
        if (minor == 11 || minor == 12 || minor == 13)
            return "camera-video";
        return "audio-card";
    case 5:
        switch (minor >> 4) {
        case 1:
            return "input-keyboard";
        case 2:
            return (minor & 0xf) == 5 ? "input-tablet" : "input-mouse";
        default:
            if ((minor & 0xf) == 1 || (minor & 0xf) == 2)
                return "input-gaming";
            return std::nullopt;
        }
    case 6:
        if (minor & 0x20)
            return "printer";
        if (minor & 0x08)
            return "camera-photo";
        return std::nullopt;
    default:
        return std::nullopt;
    }
}

} // namespace Bluetooth::Serving

#endif
