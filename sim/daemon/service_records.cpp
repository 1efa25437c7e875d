// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/service_records.h"

#include "world/settings.h"

#include <algorithm>
#include <iterator>

namespace Bluetooth::Sim {

namespace {

struct ServiceClass {
    const char* uuid;
    const char* shortName;
    const char* title;
    int channel;     ///< RFCOMM channel, 0 when it uses none
    const char* psm; ///< L2CAP PSM when it uses that directly
    const char* protocol;
};

constexpr ServiceClass classes[] = {
    {"1101", "spp", "Serial Port", 1, "", ""},
    {"1103", "dun", "Dial-Up Networking", 2, "", ""},
    {"1105", "opush", "OBEX Object Push", 3, "", ""},
    {"1106", "ftp", "OBEX File Transfer", 4, "", ""},
    {"1108", "hsp", "Headset", 5, "", ""},
    {"110a", "a2src", "Audio Source", 0, "0x0019", "0x0019"},
    {"110b", "a2snk", "Audio Sink", 0, "0x0019", "0x0019"},
    {"110c", "avrtg", "AVRCP Target", 0, "0x0017", "0x0017"},
    {"110e", "avrct", "AVRCP Controller", 0, "0x0017", "0x0017"},
    {"1112", "hsag", "Headset Audio Gateway", 6, "", ""},
    {"1115", "panu", "PAN User", 0, "0x000f", "0x000f"},
    {"1116", "nap", "Network Access Point", 0, "0x000f", "0x000f"},
    {"111e", "hf", "Hands-Free", 7, "", ""},
    {"111f", "hfag", "Hands-Free Audio Gateway", 8, "", ""},
    {"1124", "hid", "Human Interface Device", 0, "0x0011", "0x0011"},
    {"112f", "pbap", "Phonebook Access Server", 9, "", ""},
    {"1200", "did", "PnP Information", 0, "0x0001", ""},
};

const ServiceClass* classOf(const std::string& uuid) {
    const auto* found = std::find_if(std::begin(classes), std::end(classes),
                                     [&](const auto& c) { return fullUuid(c.uuid) == uuid; });
    return found == std::end(classes) ? nullptr : found;
}

std::string attribute(const char* id, const std::string& content) {
    return std::string("\t<attribute id=\"") + id + "\">\n" + content + "\t</attribute>\n";
}

std::string uuidElement(const std::string& uuid, int indent) {
    return std::string(static_cast<std::size_t>(indent), '\t') + "<uuid value=\"" + uuid +
           "\" />\n";
}

std::string protocol(const std::string& elements) {
    return "\t\t\t<sequence>\n" + elements + "\t\t\t</sequence>\n";
}

std::string record(guint32 handle, const std::string& uuid) {
    const ServiceClass* known = classOf(uuid);
    const GlibPtr<char> handleText(g_strdup_printf("0x%08x", handle));
    std::string xml = "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n\n<record>\n";
    xml += attribute("0x0000", std::string("\t\t<uint32 value=\"") + handleText.get() + "\" />\n");
    xml += attribute("0x0001", "\t\t<sequence>\n" +
                                   uuidElement(known ? "0x" + std::string(known->uuid) : uuid, 3) +
                                   "\t\t</sequence>\n");
    if (known) {
        std::string l2cap = uuidElement("0x0100", 4);
        if (*known->psm)
            l2cap += std::string("\t\t\t\t<uint16 value=\"") + known->psm + "\" />\n";
        std::string protocols = protocol(l2cap);
        if (known->channel) {
            const GlibPtr<char> channel(g_strdup_printf("0x%02x", known->channel));
            protocols += protocol(uuidElement("0x0003", 4) + "\t\t\t\t<uint8 value=\"" +
                                  channel.get() + "\" />\n");
        } else if (*known->protocol) {
            protocols += protocol(uuidElement(known->protocol, 4));
        }
        xml += attribute("0x0004", "\t\t<sequence>\n" + protocols + "\t\t</sequence>\n");
    }
    xml += attribute("0x0005", "\t\t<sequence>\n" + uuidElement("0x1002", 3) + "\t\t</sequence>\n");
    if (known)
        xml += attribute("0x0100", std::string("\t\t<text value=\"") + known->title + "\" />\n");
    return xml + "</record>\n";
}

} // namespace

std::string uuidOfPattern(const std::string& pattern) {
    for (const ServiceClass& known : classes)
        if (g_ascii_strcasecmp(pattern.c_str(), known.shortName) == 0)
            return fullUuid(known.uuid);
    return fullUuid(pattern);
}

Value serviceRecords(const std::vector<std::string>& uuids, const std::string& wanted) {
    GVariantBuilder records;
    g_variant_builder_init(&records, G_VARIANT_TYPE("a{us}"));
    guint32 handle = 0x10000;
    for (const std::string& uuid : uuids) {
        if (wanted.empty() || wanted == uuid)
            g_variant_builder_add(&records, "{us}", handle, record(handle, uuid).c_str());
        ++handle;
    }
    return g_variant_builder_end(&records);
}

} // namespace Bluetooth::Sim
