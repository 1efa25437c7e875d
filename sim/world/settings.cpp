#include "world/settings.h"

#include "serving.h"
#include "serving/bluez4/address.h"
#include "serving/bus/glib_ptr.h"
#include "world/behaviour.h"

#include <algorithm>
#include <limits>

namespace Bluetooth::Sim {

namespace {

guint64 number(const std::string& text, guint64 most) {
    const bool hexadecimal =
        text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    guint64 value = 0;
    if (!g_ascii_string_to_unsigned(hexadecimal ? text.c_str() + 2 : text.c_str(),
                                    hexadecimal ? 16 : 10, 0, most, &value, nullptr))
        throw std::invalid_argument("\"" + text + "\" is not a number from 0 to " +
                                    std::to_string(most));
    return value;
}

gint16 signedNumber(const std::string& text) {
    gint64 value = 0;
    if (!g_ascii_string_to_signed(text.c_str(), 10, G_MININT16, G_MAXINT16, &value, nullptr))
        throw std::invalid_argument("\"" + text + "\" is not a number from -32768 to 32767");
    return static_cast<gint16>(value);
}

bool flag(const std::string& text) {
    if (text != "true" && text != "false")
        throw std::invalid_argument("\"" + text + "\" is neither true nor false");
    return text == "true";
}

std::vector<std::string> list(const std::string& text) {
    std::vector<std::string> items;
    const GlibPtr<char*> parts(g_strsplit(text.c_str(), ";", -1));
    for (char** part = parts.get(); *part; ++part)
        if (*g_strstrip(*part))
            items.emplace_back(*part);
    return items;
}

std::vector<std::string> uuidList(const std::string& text) {
    std::vector<std::string> uuids;
    for (const std::string& item : list(text)) {
        uuids.push_back(fullUuid(item));
        if (uuids.back().empty())
            throw std::invalid_argument("\"" + item + "\" is not a UUID");
    }
    return uuids;
}

template <class T>
guint32 u32(const T& text) {
    return static_cast<guint32>(number(text, G_MAXUINT32));
}

guint16 u16(const std::string& text) {
    return static_cast<guint16>(number(text, G_MAXUINT16));
}

template <class T>
struct Key {
    const char* name;
    void (*set)(T& target, const std::string& value);
};

template <class T>
void apply(T& target, const Key<T>* keys, std::size_t count, const std::string& name,
           const std::string& value) {
    const Key<T>* end = keys + count;
    const Key<T>* key = std::find_if(keys, end, [&](const Key<T>& k) { return name == k.name; });
    if (key == end)
        throw SettingError(name, "there is no such key");
    try {
        key->set(target, value);
    } catch (const std::invalid_argument& wrong) {
        throw SettingError(name, wrong.what());
    }
}

const Key<PeerDevice> peerKeys[] = {
    {"Name", [](PeerDevice& p, const std::string& v) { p.name = v; }},
    {"Adapter", [](PeerDevice& p, const std::string& v) { p.adapter = v; }},
    {"Class", [](PeerDevice& p, const std::string& v) { p.deviceClass = u32(v); }},
    {"RSSI", [](PeerDevice& p, const std::string& v) { p.rssi = signedNumber(v); }},
    {"RSSIVariation",
     [](PeerDevice& p, const std::string& v) {
         p.rssiVariation = static_cast<guint>(number(v, 100));
     }},
    {"UUIDs", [](PeerDevice& p, const std::string& v) { p.uuids = uuidList(v); }},
    {"Vendor", [](PeerDevice& p, const std::string& v) { p.vendor = u16(v); }},
    {"Product", [](PeerDevice& p, const std::string& v) { p.product = u16(v); }},
    {"Version", [](PeerDevice& p, const std::string& v) { p.version = u16(v); }},
    {"Present", [](PeerDevice& p, const std::string& v) { p.present = flag(v); }},
    {"Connectable", [](PeerDevice& p, const std::string& v) { p.connectable = flag(v); }},
    {"NameInInquiry", [](PeerDevice& p, const std::string& v) { p.nameInInquiry = flag(v); }},
    {"LowEnergy", [](PeerDevice& p, const std::string& v) { p.lowEnergy = flag(v); }},
    {"Broadcaster", [](PeerDevice& p, const std::string& v) { p.broadcaster = flag(v); }},
    {"ConnectsBack", [](PeerDevice& p, const std::string& v) { p.connectsBack = flag(v); }},
    {"VisibleFor", [](PeerDevice& p, const std::string& v) { p.visibleFor = u32(v); }},
    {"LegacyPairing", [](PeerDevice& p, const std::string& v) { p.legacy = flag(v); }},
    {"Capability",
     [](PeerDevice& p, const std::string& v) {
         const auto capability = parseCapability(v);
         if (!capability)
             throw std::invalid_argument("\"" + v + "\" is not a capability");
         p.capability = *capability;
     }},
    {"PIN", [](PeerDevice& p, const std::string& v) { p.pin = v; }},
    {"Passkey", [](PeerDevice& p,
                   const std::string& v) { p.passkey = static_cast<guint32>(number(v, 999999)); }},
    {"PairingTime", [](PeerDevice& p, const std::string& v) { p.pairingTime = u32(v); }},
    {"Known", [](PeerDevice& p, const std::string& v) { p.known = flag(v); }},
    {"Paired",
     [](PeerDevice& p, const std::string& v) {
         p.paired = flag(v);
         p.known = p.known || p.paired;
     }},
    {"Trusted", [](PeerDevice& p, const std::string& v) { p.trusted = flag(v); }},
    {"Blocked", [](PeerDevice& p, const std::string& v) { p.blocked = flag(v); }},
    {"Alias", [](PeerDevice& p, const std::string& v) { p.alias = v; }},
};

const Key<AdapterHardware> adapterKeys[] = {
    {"Address",
     [](AdapterHardware& a, const std::string& v) {
         if (!isAddress(v))
             throw std::invalid_argument("\"" + v + "\" is not an address");
         a.address = upperCase(v);
     }},
    {"Name", [](AdapterHardware& a, const std::string& v) { a.name = v; }},
    {"Class", [](AdapterHardware& a, const std::string& v) { a.deviceClass = u32(v); }},
    {"Powered", [](AdapterHardware& a, const std::string& v) { a.powered = flag(v); }},
    {"Discoverable", [](AdapterHardware& a, const std::string& v) { a.discoverable = flag(v); }},
    {"Pairable", [](AdapterHardware& a, const std::string& v) { a.pairable = flag(v); }},
    {"DiscoverableTimeout",
     [](AdapterHardware& a, const std::string& v) { a.discoverableTimeout = u32(v); }},
    {"PairableTimeout",
     [](AdapterHardware& a, const std::string& v) { a.pairableTimeout = u32(v); }},
    {"UUIDs", [](AdapterHardware& a, const std::string& v) { a.uuids = uuidList(v); }},
};

} // namespace

void applySettings(PeerDevice& peer, const Settings& settings) {
    for (const auto& [key, value] : settings) {
        if (key != "Behaviour")
            continue;
        for (const std::string& name : list(value)) {
            const Behaviour* behaviour = findBehaviour(name);
            if (!behaviour)
                throw SettingError(key, "\"" + name + "\" is not a behaviour");
            behaviour->apply(peer);
        }
    }
    for (const auto& [key, value] : settings)
        if (key != "Behaviour")
            apply(peer, peerKeys, std::size(peerKeys), key, value);
}

void applySettings(AdapterHardware& adapter, const Settings& settings) {
    for (const auto& [key, value] : settings)
        apply(adapter, adapterKeys, std::size(adapterKeys), key, value);
}

void applySettings(Times& times, const Settings& settings) {
    for (const auto& [key, value] : settings) {
        const auto& keys = Times::keys();
        const auto found = std::find_if(keys.begin(), keys.end(),
                                        [&, &name = key](const auto& k) { return name == k.name; });
        if (found == keys.end())
            throw SettingError(key, "there is no such time");
        try {
            times.*(found->time) = static_cast<guint>(number(value, G_MAXINT));
        } catch (const std::invalid_argument& wrong) {
            throw SettingError(key, wrong.what());
        }
    }
}

std::string fullUuid(const std::string& text) {
    static const std::string base = "-0000-1000-8000-00805f9b34fb";
    std::string digits = text.compare(0, 2, "0x") == 0 ? text.substr(2) : text;
    for (char& c : digits)
        c = g_ascii_tolower(c);
    const bool full = digits.size() == 36;
    for (std::size_t i = 0; i < digits.size(); ++i) {
        const bool dash = full && (i == 8 || i == 13 || i == 18 || i == 23);
        if (dash ? digits[i] != '-' : !g_ascii_isxdigit(digits[i]))
            return "";
    }
    if (digits.size() == 4)
        return "0000" + digits + base;
    if (digits.size() == 8)
        return digits + base;
    return full ? digits : "";
}

} // namespace Bluetooth::Sim
