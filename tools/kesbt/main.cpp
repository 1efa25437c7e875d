// kesbt: works with Bluetooth from the command line, through BlueZ 4's bluetoothd.

#include "command/answer_limit.h"
#include "command/verb.h"
#include "show/failure.h"
#include "show/output.h"
#include "show/text.h"

#include <dbus/dbus.h>
#include <fcntl.h>
#include <unistd.h>

#include <iostream>
#include <sstream>

namespace Kesbt {

namespace {

std::string indented(const std::string& lines) {
    std::istringstream stream(lines);
    std::string result;
    for (std::string line; std::getline(stream, line);)
        result.append("  ").append(line).append("\n");
    return result;
}

std::string checkAdapter(const std::string& text) {
    const bool isName = text.size() > 3 && text.compare(0, 3, "hci") == 0 &&
                        text.find_first_not_of("0123456789", 3) == std::string::npos;
    return isName || isAddress(text) ? "" : quoted(text) + " is no adapter such as hci0";
}

void addOptions(CLI::App& program, Options& options) {
    program.add_option("--adapter", options.adapter, "The adapter: hci0, or its address")
        ->type_name("ADAPTER")
        ->transform(addressInCapitals)
        ->check(checkAdapter);
    program.add_flag("--json", options.json,
                     "Results for programs: one document, or one line an event");
    program
        .add_option_function<double>(
            "--timeout",
            [&options](double seconds) {
                options.timeout = seconds;
                options.limited = true;
                AnswerLimit::set(options);
            },
            "How long the daemon may take, in seconds (default: 25)")
        ->type_name("SECONDS")
        ->check(checkSeconds);
    program.set_version_flag("--version", "kesbt " KESBT_VERSION);
}

void addVerbs(CLI::App& program, const Options& options) {
    for (const Verb* verb : allVerbs()) {
        CLI::App* command = program.add_subcommand(verb->name, verb->summary);
        command->group(verb->group);
        command->footer("Examples:\n" + indented(verb->examples) +
                        "\nOptions of every verb: --adapter, --json, --timeout; see: kesbt --help");
        verb->build(*command, options);
    }
}

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

std::string unknownWord(const std::string& word, const CLI::App& program, const CLI::App& chosen) {
    std::string what;
    if (word.rfind('-', 0) == 0)
        what = "there is no option " + quoted(word);
    else if (!chosen.get_subcommands({}).empty())
        what = "there is no verb " + quoted(word);
    else
        what = quoted(word) + " is too much";
    const std::string meant = nearest(word.substr(0, word.find('=')), words(program, chosen));
    return meant.empty() ? what : what + " (did you mean " + meant + "?)";
}

/// One line that tells what is wrong and where to read on.
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
        what = unknownWord(rest.front(), program, *chosen);
    return wrongUsage(printable(what) + "; see: " + command + " --help");
}

/// A closed standard descriptor would be taken by the next socket, and results be written there.
void checkDescriptors() {
    for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (fcntl(standard, F_GETFD) >= 0)
            continue;
        const int opened = open("/dev/null", O_RDWR); // the lowest free one
        if (standard == STDOUT_FILENO || opened < 0)
            throw Failure("standard output is closed; give results somewhere to go");
    }
}

int run(int argc, char** argv) {
    Options options;
    CLI::App program("Works with Bluetooth through bluetoothd (BlueZ 4).", "kesbt");
    program.fallthrough(); // global options may stand behind the verb too
    program.require_subcommand(1);
    constexpr std::size_t nameColumns = 20;
    program.get_formatter()->column_width(nameColumns);
    program.get_formatter()->label("SUBCOMMAND", "VERB ...");
    program.footer("kesbt VERB --help tells more about a verb and gives examples.\n"
                   "Exit status: 0 success, 1 failure, 2 wrong usage.\n");
    addOptions(program, options);
    addVerbs(program, options);
    try {
        program.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        if (error.get_exit_code() != 0)
            throw usageFailure(program, error);
        program.exit(error);
    }
    flushOutput();
    return 0;
}

} // namespace

} // namespace Kesbt

int main(int argc, char** argv) {
    // Without this libdbus ignores SIGPIPE, and "kesbt monitor | head" would not end.
    dbus_connection_set_change_sigpipe(false);
    try {
        Kesbt::checkDescriptors();
        return Kesbt::run(argc, argv);
    } catch (const Kesbt::Failure& failure) {
        std::cout.flush();
        std::cerr << failure.what() << '\n';
        return failure.status();
    } catch (const std::exception& error) {
        std::cerr << "kesbt: " << Kesbt::printable(error.what()) << "; please report this\n";
        return 1;
    }
}
