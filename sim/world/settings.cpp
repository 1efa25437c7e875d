// SPDX-License-Identifier: LGPL-2.1-or-later
#include "world/settings.h"

#include "serving.h"
#include "serving/bluez4/address.h"
#include "serving/bus/glib_ptr.h"
#include "world/behaviour.h"

#include <algorithm>
#include <iterator>
#include <optional>

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

std::vector<std::string> list(const std::string& text) {
    std::vector<std::string> items;
    const GlibPtr<char*> parts(g_strsplit(text.c_str(), ";", -1));
    for (char** part = parts.get(); *part; ++part)
        if (*g_strstrip(*part))
            items.emplace_back(*part);
    return items;
}

// How a setting of each type is written; std::invalid_argument says what is wrong with another.

void parse(const std::string& text, std::string& value) {
    value = text;
}

void parse(const std::string& text, bool& value) {
    if (text != "true" && text != "false")
        throw std::invalid_argument("\"" + text + "\" is neither true nor false");
    value = text == "true";
}

void parse(const std::string& text, guint32& value) {
    value = static_cast<guint32>(number(text, G_MAXUINT32));
}

void parse(const std::string& text, guint16& value) {
    value = static_cast<guint16>(number(text, G_MAXUINT16));
}

void parse(const std::string& text, gint16& value) {
    gint64 parsed = 0;
    if (!g_ascii_string_to_signed(text.c_str(), 10, G_MININT16, G_MAXINT16, &parsed, nullptr))
        throw std::invalid_argument("\"" + text + "\" is not a number from -32768 to 32767");
    value = static_cast<gint16>(parsed);
}

void parse(const std::string& text, Capability& value) {
    const auto capability = parseCapability(text);
    if (!capability)
        throw std::invalid_argument("\"" + text + "\" is not a capability");
    value = *capability;
}

/// UUIDs
void parse(const std::string& text, std::vector<std::string>& value) {
    value.clear();
    for (const std::string& item : list(text)) {
        value.push_back(fullUuid(item));
        if (value.back().empty())
            throw std::invalid_argument("\"" + item + "\" is not a UUID");
    }
}

template <class T>
void parse(const std::string& text, std::optional<T>& value) {
    parse(text, value.emplace());
}

template <class T>
struct SettingKey {
    const char* name;
    void (*set)(T& target, const std::string& text);
};

template <auto Member, class T>
void set(T& target, const std::string& text) {
    parse(text, target.*Member);
}

template <auto Member, guint32 Most, class T>
void setUpTo(T& target, const std::string& text) {
    target.*Member = static_cast<guint32>(number(text, Most));
}

const SettingKey<PeerDevice> deviceKeys[] = {
    {"Name", set<&PeerDevice::name>},
    {"Adapter", set<&PeerDevice::adapter>},
    {"Class", set<&PeerDevice::deviceClass>},
    {"RSSI", set<&PeerDevice::rssi>},
    {"RSSIVariation", setUpTo<&PeerDevice::rssiVariation, 100>},
    {"UUIDs", set<&PeerDevice::uuids>},
    {"Vendor", set<&PeerDevice::vendor>},
    {"Product", set<&PeerDevice::product>},
    {"Version", set<&PeerDevice::version>},
    {"Present", set<&PeerDevice::present>},
    {"Connectable", set<&PeerDevice::connectable>},
    {"NameInInquiry", set<&PeerDevice::nameInInquiry>},
    {"LowEnergy", set<&PeerDevice::lowEnergy>},
    {"Broadcaster", set<&PeerDevice::broadcaster>},
    {"ConnectsBack", set<&PeerDevice::connectsBack>},
    {"AudioEndpoint", set<&PeerDevice::audioEndpoint>},
    {"AudioHangs", set<&PeerDevice::audioHangs>},
    {"DocumentedNetwork", set<&PeerDevice::documentedNetwork>},
    {"Refuses", set<&PeerDevice::refuses>},
    {"VisibleFor", set<&PeerDevice::visibleFor>},
    {"LegacyPairing", set<&PeerDevice::legacy>},
    {"Capability", set<&PeerDevice::capability>},
    {"PIN", set<&PeerDevice::pin>},
    {"Passkey", setUpTo<&PeerDevice::passkey, 999999>},
    {"PairingTime", set<&PeerDevice::pairingTime>},
    {"Known", set<&PeerDevice::known>},
    {"Paired",
     [](PeerDevice& device, const std::string& text) {
         parse(text, device.paired);
         device.known = device.known || device.paired;
     }},
    {"Trusted", set<&PeerDevice::trusted>},
    {"Blocked", set<&PeerDevice::blocked>},
    {"Alias", set<&PeerDevice::alias>},
};

const SettingKey<AdapterHardware> adapterKeys[] = {
    {"Address",
     [](AdapterHardware& adapter, const std::string& text) {
         if (!isAddress(text))
             throw std::invalid_argument("\"" + text + "\" is not an address");
         adapter.address = upperCase(text);
     }},
    {"Name", set<&AdapterHardware::name>},
    {"Class", set<&AdapterHardware::deviceClass>},
    {"Powered", set<&AdapterHardware::powered>},
    {"Discoverable", set<&AdapterHardware::discoverable>},
    {"Pairable", set<&AdapterHardware::pairable>},
    {"DiscoverableTimeout", set<&AdapterHardware::discoverableTimeout>},
    {"PairableTimeout", set<&AdapterHardware::pairableTimeout>},
    {"UUIDs", set<&AdapterHardware::uuids>},
};

const SettingKey<AudioConfiguration> audioKeys[] = {
    {"Enable",
     [](AudioConfiguration& audio, const std::string& text) {
         audio.source = audio.gateway = false;
         for (const std::string& item : list(text)) {
             if (item != "Source" && item != "Gateway")
                 throw std::invalid_argument("\"" + item + "\" is neither Source nor Gateway");
             (item == "Source" ? audio.source : audio.gateway) = true;
         }
     }},
    {"SCORouting",
     [](AudioConfiguration& audio, const std::string& text) {
         if (text != "HCI" && text != "PCM")
             throw std::invalid_argument("\"" + text + "\" is neither HCI nor PCM");
         audio.scoByPcm = text == "PCM";
     }},
};

template <guint Times::*Member>
constexpr auto setTime = setUpTo<Member, G_MAXINT, Times>;

const SettingKey<Times> timeKeys[] = {
    {"Inquiry", setTime<&Times::inquiry>},
    {"InquiryGap", setTime<&Times::inquiryGap>},
    {"FirstFound", setTime<&Times::firstFound>},
    {"FoundInterval", setTime<&Times::foundInterval>},
    {"NameRequest", setTime<&Times::nameRequest>},
    {"Connect", setTime<&Times::connect>},
    {"PageTimeout", setTime<&Times::pageTimeout>},
    {"ServiceSearch", setTime<&Times::serviceSearch>},
    {"ReverseSearch", setTime<&Times::reverseSearch>},
    {"Pairing", setTime<&Times::pairing>},
    {"KeyPress", setTime<&Times::keyPress>},
    {"ModeChange", setTime<&Times::modeChange>},
    {"LinkLoss", setTime<&Times::linkLoss>},
    {"IdleDisconnect", setTime<&Times::idleDisconnect>},
    {"DisconnectRequest", setTime<&Times::disconnectRequest>},
    {"ChannelConnect", setTime<&Times::channelConnect>},
    {"AudioConnect", setTime<&Times::audioConnect>},
    {"AudioTimeout", setTime<&Times::audioTimeout>},
    {"AudioRetry", setTime<&Times::audioRetry>},
    {"AudioPause", setTime<&Times::audioPause>},
    {"AudioShutdown", setTime<&Times::audioShutdown>},
    {"AudioClose", setTime<&Times::audioClose>},
    {"AudioIdle", setTime<&Times::audioIdle>},
    {"AudioIdleAtPeer", setTime<&Times::audioIdleAtPeer>},
    {"ControlConnect", setTime<&Times::controlConnect>},
    {"PairingTimeout", setTime<&Times::pairingTimeout>},
    {"AgentTimeout", setTime<&Times::agentTimeout>},
};

/// @param what  what a key is called in the message about an unknown one
template <class T, std::size_t Count>
void apply(T& target, const SettingKey<T> (&keys)[Count], const Settings& settings,
           const char* what = "key") {
    for (const auto& [name, text] : settings) {
        const auto* key = std::find_if(std::begin(keys), std::end(keys),
                                       [&, &n = name](const auto& k) { return n == k.name; });
        if (key == std::end(keys))
            throw SettingError(name, std::string("there is no such ") + what);
        try {
            key->set(target, text);
        } catch (const std::invalid_argument& wrong) {
            throw SettingError(name, wrong.what());
        }
    }
}

} // namespace

void applySettings(PeerDevice& device, const Settings& settings) {
    Settings others;
    for (const auto& [key, value] : settings) {
        if (key != "Behaviour") {
            others.emplace_back(key, value);
            continue;
        }
        for (const std::string& name : list(value)) {
            const Behaviour* behaviour = findBehaviour(name);
            if (!behaviour)
                throw SettingError(key, "\"" + name + "\" is not a behaviour");
            behaviour->apply(device);
        }
    }
    apply(device, deviceKeys, others);
}

void applySettings(AdapterHardware& adapter, const Settings& settings) {
    apply(adapter, adapterKeys, settings);
}

void applySettings(AudioConfiguration& audio, const Settings& settings) {
    apply(audio, audioKeys, settings);
}

void applySettings(Times& times, const Settings& settings) {
    apply(times, timeKeys, settings, "time");
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
