// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/command_line.h"

#include "command/help.h"
#include "command/usage.h"
#include "show/text.h"

#include <algorithm>
#include <iostream>
#include <sstream>
#include <utility>

namespace Kesbt {

namespace {

std::string indented(const std::string& lines) {
    std::istringstream stream(lines);
    std::string result;
    for (std::string line; std::getline(stream, line);)
        result.append("  ").append(line).append("\n");
    return result;
}

std::vector<CLI::Option*> arguments(CLI::App& app) {
    return app.get_options([](const CLI::Option* option) { return option->get_positional(); });
}

/// For a verb that stands alone or has a word behind it the arguments of the verb alone are
/// optional to the parser, which gives them what is too much behind the word.
void checkArguments(CLI::App& app) {
    for (const CLI::Option* argument : arguments(*app.get_parent())) {
        if (argument->count() != 0)
            throw wrongUsage(quoted(argument->results().front()) + " is too much; see: kesbt " +
                             app.get_parent()->get_name() + " " + app.get_name() + " --help");
    }
    for (const CLI::Option* argument : arguments(app)) {
        if (argument->count() == 0 && !app.get_subcommands({}).empty())
            throw wrongUsage(argument->get_name() + " is required; see: kesbt " + app.get_name() +
                             " --help");
    }
}

std::string checkAdapter(const std::string& text) {
    const bool isName = text.size() > 3 && text.compare(0, 3, "hci") == 0 &&
                        text.find_first_not_of("0123456789", 3) == std::string::npos;
    return isName || isAddress(text) ? "" : quoted(text) + " is no adapter such as hci0";
}

} // namespace

CommandLine::CommandLine(std::vector<const Verb*> verbs, Offer adapters)
    : m_verbs(std::move(verbs)),
      m_program("Works with Bluetooth through bluetoothd (BlueZ 4).", "kesbt") {
    m_program.fallthrough(); // global options may stand behind the verb too
    m_program.require_subcommand(1);
    m_program.formatter(std::make_shared<Help>());
    m_program.footer("kesbt VERB --help tells more about a verb and gives examples.\n"
                     "Exit status: 0 success, 1 failure, 2 wrong usage.\n");
    addOptions(adapters);
}

void CommandLine::run(int argc, const char* const* argv) {
    addVerbs(argc > 1 ? argv[1] : "");
    if (argc > 1 && argv[1] == std::string("--complete")) {
        printCompletions({argv + 2, argv + argc});
        return;
    }
    try {
        m_program.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        if (error.get_exit_code() != 0)
            throw usageFailure(m_program, error);
        m_program.exit(error);
    }
}

void CommandLine::printCompletions(const std::vector<std::string>& words) {
    try {
        for (const std::string& word : m_completion.complete(m_program, words))
            std::cout << printable(word) << '\n';
    } catch (const Failure&) { // without a daemon there is nothing to offer
    }
}

void CommandLine::addOptions(Offer adapters) {
    const CLI::Option* adapter =
        m_program.add_option("--adapter", m_options.adapter, "The adapter: hci0, or its address")
            ->type_name("ADAPTER")
            ->transform(addressInCapitals)
            ->check(checkAdapter);
    m_completion.offer(adapter, [this, adapters](const auto&) { return adapters(m_options); });
    m_program.add_flag("--json", m_options.json,
                       "Results for programs: one document, or one line an event");
    m_program
        .add_option_function<double>(
            "--timeout", [this](double seconds) { m_options.limit.give(seconds); },
            "How long the daemon may take, in seconds (default: 25)")
        ->type_name("SECONDS")
        ->check(checkSeconds);
    m_program.set_version_flag("--version", "kesbt " KESBT_VERSION);
}

/// Adds the verb that `first` names, or all of them: that takes longer than many a verb does.
void CommandLine::addVerbs(const std::string& first) {
    const auto named = std::find_if(m_verbs.begin(), m_verbs.end(),
                                    [&](const Verb* verb) { return verb->name == first; });
    if (named != m_verbs.end())
        return add(**named);
    for (const Verb* verb : m_verbs)
        add(*verb);
}

void CommandLine::add(const Verb& verb) {
    CLI::App* app = m_program.add_subcommand(verb.name, verb.summary);
    app->group(verb.group);
    app->footer("Examples:\n" + indented(verb.examples) +
                "\nOptions of every verb: --adapter, --json, --timeout; see: kesbt --help");
    for (const Form& form : verb.forms) {
        const bool isAlone = *form.name == '\0';
        if (isAlone)
            setAction(*app, form);
        else
            setAction(*app->add_subcommand(form.name, form.summary), form);
    }
    const bool standsAlone = *verb.forms.front().name == '\0';
    if (app->get_subcommands({}).empty())
        return;
    app->require_subcommand(standsAlone ? 0 : 1, 1);
    for (CLI::Option* argument : arguments(*app))
        argument->required(false); // a word in its place is a word
}

void CommandLine::setAction(CLI::App& app, const Form& form) {
    app.callback(
        [this, &app, limit = form.limit, action = form.build({app, m_options, m_completion})] {
            if (!app.get_subcommands().empty()) // the word behind the verb tells what to do
                return;
            checkArguments(app);
            m_options.limit.run(limit, action);
        });
}

} // namespace Kesbt
