// SPDX-License-Identifier: LGPL-2.1-or-later
#include "show/uuid.h"

#include "show/text.h"

#include <cstdlib>

namespace Kesbt {

namespace {

struct Service {
    unsigned long number;
    const char* name;
};

// The names of the Bluetooth assigned numbers.
constexpr Service services[] = {
    {0x1000, "Service Discovery Server"},
    {0x1101, "Serial Port"},
    {0x1103, "Dialup Networking"},
    {0x1104, "IrMC Sync"},
    {0x1105, "OBEX Object Push"},
    {0x1106, "OBEX File Transfer"},
    {0x1108, "Headset"},
    {0x110a, "Audio Source"},
    {0x110b, "Audio Sink"},
    {0x110c, "A/V Remote Control Target"},
    {0x110d, "Advanced Audio Distribution"},
    {0x110e, "A/V Remote Control"},
    {0x110f, "A/V Remote Control Controller"},
    {0x1112, "Headset Audio Gateway"},
    {0x1115, "PANU"},
    {0x1116, "Network Access Point"},
    {0x1117, "Group Network"},
    {0x111e, "Handsfree"},
    {0x111f, "Handsfree Audio Gateway"},
    {0x1124, "Human Interface Device"},
    {0x112d, "SIM Access"},
    {0x112f, "Phonebook Access Server"},
    {0x1132, "Message Access Server"},
    {0x1200, "PnP Information"},
    {0x1203, "Generic Audio"},
    {0x1800, "Generic Access"},
    {0x1801, "Generic Attribute"},
};

constexpr char base[] = "-0000-1000-8000-00805F9B34FB";

} // namespace

std::string uuidName(const std::string& uuid) {
    const std::string text = upperCase(uuid);
    const bool isLong = text.size() == 36 && text.compare(8, std::string::npos, base) == 0;
    const bool isShort = text.size() == 6 && text.compare(0, 2, "0X") == 0;
    if (!isLong && !isShort)
        return "";
    const unsigned long number = std::strtoul(text.c_str(), nullptr, 16);
    for (const Service& service : services) {
        if (service.number == number)
            return service.name;
    }
    return "";
}

} // namespace Kesbt
