// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/completion.h"

#include "show/text.h"

#include <algorithm>
#include <utility>

namespace Kesbt {

namespace {

/// What the words before the one to complete say.
struct Place {
    CLI::App* verb;
    CLI::Option* option = nullptr; ///< whose value comes next
    std::vector<std::string> arguments = {};
};

bool isOption(const std::string& word) {
    return word.rfind('-', 0) == 0;
}

/// @param word may have the value behind "="
CLI::Option* findOption(CLI::App& program, CLI::App& verb, const std::string& word) {
    const std::string name = word.substr(0, word.find('='));
    CLI::Option* option = verb.get_option_no_throw(name);
    if (!option)
        option = program.get_option_no_throw(name);
    const bool takesValue = option && option->get_items_expected_max() > 0;
    return takesValue ? option : nullptr;
}

void setOption(CLI::Option& option, const std::string& value) {
    try {
        option.add_result(value);
        option.run_callback();
    } catch (const CLI::Error&) {
        option.clear(); // as if it was not there
    }
}

Place follow(CLI::App& program, const std::vector<std::string>& words) {
    Place place{&program};
    for (const std::string& word : words) {
        if (place.option) {
            setOption(*std::exchange(place.option, nullptr), word);
            continue;
        }
        if (isOption(word)) {
            const std::size_t value = word.find('=');
            place.option = findOption(program, *place.verb, word);
            if (place.option && value != std::string::npos)
                setOption(*std::exchange(place.option, nullptr), word.substr(value + 1));
            continue;
        }
        const auto verbs = place.verb->get_subcommands({});
        const auto verb = std::find_if(verbs.begin(), verbs.end(), [&](const CLI::App* one) {
            return one->get_name() == word;
        });
        if (verb != verbs.end() && place.arguments.empty())
            place.verb = *verb;
        else
            place.arguments.push_back(word);
    }
    return place;
}

/// A verb has its own options and those of every verb.
std::vector<std::string> optionNames(const CLI::App& program, const CLI::App& verb) {
    std::vector<std::string> names;
    for (const CLI::App* app : {&verb, &program}) {
        for (const CLI::Option* option : app->get_options()) {
            const bool isOfProgramOnly =
                option == program.get_help_ptr() || option == program.get_version_ptr();
            if (isOfProgramOnly && &verb != &program)
                continue;
            for (const std::string& name : option->get_lnames())
                names.push_back("--" + name);
        }
    }
    return names;
}

/// The argument that comes next; null when there is none.
const CLI::Option* nextArgument(const Place& place) {
    std::size_t index = 0;
    for (const CLI::Option* option : std::as_const(*place.verb).get_options()) {
        if (option->get_positional() && index++ == place.arguments.size())
            return option;
    }
    return nullptr;
}

} // namespace

void Completion::offer(const CLI::Option* option, Choices choices) {
    m_choices[option] = std::move(choices);
}

std::vector<std::string> Completion::complete(CLI::App& program,
                                              std::vector<std::string> words) const {
    std::string begun;
    if (!words.empty()) {
        begun = words.back();
        words.pop_back();
    }
    const Place place = follow(program, words);
    std::vector<std::string> offered;
    if (place.option) {
        offered = choicesOf(place.option, place.arguments);
    } else if (isOption(begun)) {
        offered = optionNames(program, *place.verb);
    } else {
        offered = choicesOf(nextArgument(place), place.arguments);
        if (place.arguments.empty()) {
            for (const CLI::App* verb : place.verb->get_subcommands({}))
                offered.push_back(verb->get_name());
        }
    }
    if (begun.find(':') != std::string::npos) // an address, which may be written in either case
        begun = upperCase(begun);
    offered.erase(
        std::remove_if(offered.begin(), offered.end(),
                       [&begun](const std::string& word) { return word.rfind(begun, 0) != 0; }),
        offered.end());
    std::sort(offered.begin(), offered.end());
    offered.erase(std::unique(offered.begin(), offered.end()), offered.end());
    return offered;
}

std::vector<std::string> Completion::choicesOf(const CLI::Option* option,
                                               const std::vector<std::string>& before) const {
    const auto found = m_choices.find(option);
    return found == m_choices.end() ? std::vector<std::string>() : found->second(before);
}

} // namespace Kesbt
