// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/habits.h"

#include "show/text.h"

#include <algorithm>
#include <iterator>

namespace Kesbt {

namespace {

struct Habit {
    const char* typed;
    const char* meant; ///< ADDRESS and VALUE stand for what was typed behind the word
};

// Those of bluetoothctl, hcitool and bluez-test-*.
constexpr Habit habits[] = {
    {"agent on", "agent"},
    {"alias", "device set ADDRESS Alias NAME"},
    {"audio headset", "headset"},
    {"autoconnect off", "autoconnect disable"},
    {"autoconnect on", "autoconnect enable"},
    {"block", "device set ADDRESS Blocked true"},
    {"cancel-pairing", "cancel ADDRESS"},
    {"connect", "audio connect ADDRESS"},
    {"controllers", "adapters"},
    {"delete", "remove ADDRESS"},
    {"discoverable", "adapter set Discoverable VALUE"},
    {"find", "discover"},
    {"forget", "remove ADDRESS"},
    {"help", "--help"},
    {"info", "device ADDRESS"},
    {"inquiry", "discover"},
    {"list", "devices"},
    {"pairable", "adapter set Pairable VALUE"},
    {"paired-devices", "devices"},
    {"power", "adapter set Powered VALUE"},
    {"rename", "device set ADDRESS Alias NAME"},
    {"scan off", "scan stop"},
    {"scan on", "discover"},
    {"search", "discover"},
    {"set", "adapter set NAME VALUE"},
    {"show", "adapter"},
    {"status", "audio status ADDRESS"},
    {"status headset", "headset status ADDRESS"}, // typed as "audio headset status"
    {"trust", "device set ADDRESS Trusted true"},
    {"unblock", "device set ADDRESS Blocked false"},
    {"unpair", "remove ADDRESS"},
    {"untrust", "device set ADDRESS Trusted false"},
    {"version", "--version"},
};

bool isValue(const std::string& word) {
    static const std::vector<std::string> values = {"on", "off", "yes", "no", "true", "false"};
    return std::find(values.begin(), values.end(), word) != values.end();
}

void fillIn(std::string& command, const std::string& name, const std::vector<std::string>& words,
            bool (*isMeant)(const std::string&)) {
    const std::size_t place = command.find(name);
    const auto word = std::find_if(words.begin(), words.end(), isMeant);
    if (place != std::string::npos && word != words.end())
        command.replace(place, name.size(), *word);
}

} // namespace

std::string habitMeant(const std::string& verb, const std::vector<std::string>& words) {
    const std::string typed = verb + (verb.empty() ? "" : " ") + words.front();
    const auto* const habit = std::find_if(std::begin(habits), std::end(habits),
                                           [&](const Habit& row) { return typed == row.typed; });
    if (habit == std::end(habits))
        return "";
    std::string command = std::string("kesbt ") + habit->meant;
    fillIn(command, "ADDRESS", words, isAddress);
    fillIn(command, "VALUE", words, isValue);
    return command;
}

} // namespace Kesbt
