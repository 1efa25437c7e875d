#ifndef KESBLUETOOTH_SIM_WORLD_ICON_H
#define KESBLUETOOTH_SIM_WORLD_ICON_H

#include <glib.h>

namespace Bluetooth::Sim {

/// The icon name of a class of device, or null for a class without one.
inline const char* iconOf(guint32 deviceClass) {
    const guint32 major = (deviceClass >> 8) & 0x1f;
    const guint32 minor = (deviceClass >> 2) & 0x3f;
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
            return (minor & 0xf) == 1 || (minor & 0xf) == 2 ? "input-gaming" : nullptr;
        }
    case 6:
        if (minor & 0x20)
            return "printer";
        return minor & 0x08 ? "camera-photo" : nullptr;
    default:
        return nullptr;
    }
}

} // namespace Bluetooth::Sim

#endif
