// SPDX-License-Identifier: LGPL-2.1-or-later
#include "daemon/service_records.h"

#include "world/settings.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <optional>
#include <utility>

namespace Bluetooth::Sim {

namespace {

struct ServiceClass {
    const char* uuid;
    const char* second; ///< another service class of the same record, or ""
    const char* profile;
    const char* title;
    int channel;     ///< RFCOMM channel, 0 when it uses none
    const char* psm; ///< L2CAP PSM when it uses that directly
    const char* protocol;
};

constexpr ServiceClass classes[] = {
    {"1101", "", "1101", "Serial Port", 1, "", ""},
    {"1103", "", "1103", "Dial-Up Networking", 2, "", ""},
    {"1105", "", "1105", "OBEX Object Push", 3, "", ""},
    {"1106", "", "1106", "OBEX File Transfer", 4, "", ""},
    {"1108", "1203", "1108", "Headset", 5, "", ""},
    {"110a", "", "110d", "Audio Source", 0, "0x0019", "0x0019"},
    {"110b", "", "110d", "Audio Sink", 0, "0x0019", "0x0019"},
    {"110c", "", "110e", "AVRCP TG", 0, "0x0017", "0x0017"},
    {"110e", "110f", "110e", "AVRCP CT", 0, "0x0017", "0x0017"},
    {"1112", "1203", "1108", "Headset Audio Gateway", 6, "", ""},
    {"1115", "", "1115", "PAN User", 0, "0x000f", "0x000f"},
    {"1116", "", "1116", "Network Access Point", 0, "0x000f", "0x000f"},
    {"111e", "1203", "111e", "Hands-Free", 7, "", ""},
    {"111f", "1203", "111e", "Hands-Free Audio Gateway", 8, "", ""},
    {"1124", "", "1124", "Human Interface Device", 0, "0x0011", "0x0011"},
    {"112f", "", "1130", "Phonebook Access Server", 9, "", ""},
    {"1200", "", "1200", "PnP Information", 0, "0x0001", ""},
};

struct ShortName {
    const char* name;
    const char* uuid;
};

constexpr ShortName shortNames[] = {
    {"vcp", "110f"}, {"pbap", "1130"},  {"sap", "112d"}, {"ftp", "1106"}, {"bpp", "1122"},
    {"bip", "111a"}, {"synch", "1104"}, {"dun", "1103"}, {"opp", "1105"}, {"fax", "1111"},
    {"spp", "1101"}, {"hsp", "1108"},   {"hfp", "111e"}};

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

std::string number16(const char* value) {
    return std::string("\t\t<uint16 value=\"") + value + "\" />\n";
}

std::string hexadecimal(const char* format, unsigned value) {
    return GlibPtr<char>(g_strdup_printf(format, value)).get();
}

std::string sequence(const std::string& elements) {
    return "\t\t<sequence>\n" + elements + "\t\t</sequence>\n";
}

std::string protocols(const ServiceClass& known) {
    std::string l2cap = uuidElement("0x0100", 4);
    if (*known.psm)
        l2cap += "\t\t" + number16(known.psm);
    std::string all = protocol(l2cap);
    if (known.channel)
        all += protocol(uuidElement("0x0003", 4) + "\t\t\t\t<uint8 value=\"" +
                        hexadecimal("0x%02x", static_cast<unsigned>(known.channel)) + "\" />\n");
    else if (*known.protocol)
        all += protocol(uuidElement(known.protocol, 4));
    return attribute("0x0004", sequence(all));
}

std::string deviceId(const PeerDevice& peer) {
    std::string xml;
    const std::pair<const char*, std::optional<guint16>> ids[] = {
        {"0x0201", peer.vendor}, {"0x0202", peer.product}, {"0x0203", peer.version}};
    for (const auto& [id, value] : ids)
        xml += attribute(id, number16(hexadecimal("0x%04x", value.value_or(0)).c_str()));
    return xml;
}

std::string record(const PeerDevice& peer, guint32 handle, const std::string& uuid) {
    const ServiceClass* known = classOf(uuid);
    const auto shortUuid = [](const char* digits) {
        return uuidElement(std::string("0x") + digits, 3);
    };
    std::string serviceClasses = known ? shortUuid(known->uuid) : uuidElement(uuid, 3);
    if (known && *known->second)
        serviceClasses += shortUuid(known->second);
    std::string xml = "<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n\n<record>\n";
    xml += attribute("0x0000", "\t\t<uint32 value=\"" + hexadecimal("0x%08x", handle) + "\" />\n");
    xml += attribute("0x0001", sequence(serviceClasses));
    if (known)
        xml += protocols(*known);
    xml += attribute("0x0005", sequence(uuidElement("0x1002", 3)));
    if (known) {
        xml += attribute("0x0009", sequence("\t\t\t<sequence>\n\t" + shortUuid(known->profile) +
                                            "\t\t" + number16("0x0100") + "\t\t\t</sequence>\n"));
        xml += attribute("0x0100", std::string("\t\t<text value=\"") + known->title + "\" />\n");
    }
    if (uuid == fullUuid("1200"))
        xml += deviceId(peer);
    return xml + "</record>\n";
}

/// How a record's XML has a UUID: a short one in its short form.
std::string writtenForm(const std::string& uuid) {
    const std::string digits = uuid.substr(4, 4);
    return "<uuid value=\"" + (uuid == fullUuid(digits) ? "0x" + digits : uuid) + "\"";
}

} // namespace

std::string uuidOfPattern(const std::string& pattern) {
    for (const auto& [name, uuid] : shortNames)
        if (g_ascii_strcasecmp(pattern.c_str(), name) == 0)
            return fullUuid(uuid);
    return fullUuid(pattern);
}

std::string serviceNamed(const std::string& pattern) {
    const auto isDash = [&](std::size_t at) { return pattern[at] == '-'; };
    if (pattern.size() == 36 && isDash(8) && isDash(13) && isDash(18) && isDash(23))
        return pattern;
    const auto number = static_cast<guint16>(std::strtol(pattern.c_str(), nullptr, 16));
    for (const auto& [name, uuid] : shortNames)
        if (g_ascii_strcasecmp(pattern.c_str(), name) == 0 ||
            number == std::strtol(uuid, nullptr, 16))
            return fullUuid(uuid);
    return "";
}

int rfcommChannel(const std::string& uuid) {
    const ServiceClass* known = classOf(uuid);
    return known ? known->channel : 0;
}

std::vector<ServiceRecord> serviceRecords(const PeerDevice& peer, const std::string& wanted) {
    std::vector<std::string> uuids = peer.uuids;
    const std::string did = fullUuid("1200");
    if (peer.vendor && std::find(uuids.begin(), uuids.end(), did) == uuids.end())
        uuids.push_back(did);
    std::vector<ServiceRecord> records;
    guint32 handle = 0x10000;
    for (const std::string& uuid : uuids) {
        ServiceRecord found{handle, uuid, record(peer, handle, uuid)};
        ++handle;
        if (wanted.empty() || found.xml.find(writtenForm(wanted)) != std::string::npos)
            records.push_back(std::move(found));
    }
    return records;
}

Value recordValues(const std::vector<ServiceRecord>& records) {
    GVariantBuilder values;
    g_variant_builder_init(&values, G_VARIANT_TYPE("a{us}"));
    for (const ServiceRecord& record : records)
        g_variant_builder_add(&values, "{us}", record.handle, record.xml.c_str());
    return g_variant_builder_end(&values);
}

} // namespace Bluetooth::Sim
