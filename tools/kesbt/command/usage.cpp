// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/usage.h"

#include "command/habits.h"
#include "show/text.h"

#include <string>
#include <vector>

namespace Kesbt {

namespace {

/// What can stand behind the verb that was chosen.
std::vector<std::string> words(const CLI::App& program, const CLI::App& chosen) {
    std::vector<std::string> result;
    for (const CLI::App* verb : chosen.get_subcommands({}))
        result.push_back(verb->get_name());
    for (const CLI::App* app : {&program, &chosen}) {
        for (const CLI::Option* option : app->get_options()) {
            for (const std::string& name : option->get_lnames())
                result.push_back("--" + name);
        }
    }
    return result;
}

std::string unknownWord(const std::vector<std::string>& rest, const CLI::App& program,
                        const CLI::App& chosen) {
    const std::string& word = rest.front();
    std::string what;
    if (word.rfind('-', 0) == 0)
        what = "there is no option " + quoted(word);
    else if (!chosen.get_subcommands({}).empty())
        what = "there is no verb " + quoted(word);
    else
        what = quoted(word) + " is too much";
    std::string meant = habitMeant(&chosen == &program ? "" : chosen.get_name(), rest);
    const CLI::Option* adapter = program.get_option("--adapter");
    if (!meant.empty() && adapter->count() != 0)
        meant.insert(meant.find(' '), " --adapter " + adapter->results().front());
    if (meant.empty())
        meant = nearest(word.substr(0, word.find('=')), words(program, chosen));
    return meant.empty() ? what : what + " (did you mean " + meant + "?)";
}

} // namespace

Failure usageFailure(const CLI::App& program, const CLI::ParseError& error) {
    std::string command = "kesbt";
    const CLI::App* chosen = &program;
    while (!chosen->get_subcommands().empty()) {
        chosen = chosen->get_subcommands().front();
        command += " " + chosen->get_name();
    }
    std::string what = error.what();
    const std::vector<std::string> rest = program.remaining(true);
    const std::string option = what.substr(0, what.find(':'));
    if (program.get_option_no_throw(option) && !chosen->get_option_no_throw(option))
        command = "kesbt"; // an option of every verb
    const bool lacksVerb =
        dynamic_cast<const CLI::RequiredError*>(&error) && !chosen->get_subcommands({}).empty();
    if (lacksVerb && rest.empty())
        what = "a verb is missing";
    else if (lacksVerb || dynamic_cast<const CLI::ExtrasError*>(&error))
        what = unknownWord(rest, program, *chosen);
    return wrongUsage(printable(what) + "; see: " + command + " --help");
}

} // namespace Kesbt
