// SPDX-License-Identifier: LGPL-2.1-or-later
#include "command/help.h"

#include "show/style.h"
#include "show/text.h"

#include <algorithm>
#include <sstream>
#include <utility>

namespace Kesbt {

namespace {

constexpr std::size_t nameColumns = 20; // what options and verbs mean begins there
constexpr std::size_t widest = 80;

std::string layOut(std::string line, std::size_t width) {
    if (line.rfind("  kesbt ", 0) == 0)
        return line; // an example, to be copied
    const bool isEntry =
        line.size() > nameColumns && line[0] == ' ' && line[nameColumns - 1] == ' ';
    constexpr std::size_t narrow = 2 * nameColumns;
    const std::size_t indent = !isEntry ? 0 : width < narrow ? 4 : nameColumns;
    const std::size_t leading = line.find_first_not_of(' ');
    if (isEntry && leading > indent)
        line.erase(0, leading - indent);
    return wrapped(std::move(line), width, indent);
}

} // namespace

Help::Help() {
    column_width(nameColumns);
    label("SUBCOMMAND", "VERB ...");
}

std::string Help::make_help(const CLI::App* app, std::string name, CLI::AppFormatMode mode) const {
    const std::size_t width = std::min(widest, lineWidth());
    std::istringstream lines(CLI::Formatter::make_help(app, std::move(name), mode));
    std::string help;
    for (std::string line; std::getline(lines, line);)
        help.append(layOut(std::move(line), width)).append("\n");
    return help;
}

/// Which options exclude each other is said when both are given.
std::string Help::make_option_opts(const CLI::Option* option) const {
    const std::string text = CLI::Formatter::make_option_opts(option);
    return text.substr(0, text.find(" Excludes:"));
}

} // namespace Kesbt
