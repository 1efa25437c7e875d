// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMAND_COMPLETION_H
#define KESBT_COMMAND_COMPLETION_H

#include <CLI/CLI.hpp>

#include <functional>
#include <map>
#include <string>
#include <vector>

namespace Kesbt {

/// What an option or an argument can be, given the arguments of the verb before it.
using Choices = std::function<std::vector<std::string>(const std::vector<std::string>& before)>;

/// What a shell can offer for the next word: verbs and options as the command line is parsed with
/// them, and the choices that were named for an option or an argument.
class Completion {
public:
    /// Without this nothing is offered for it.
    void offer(const CLI::Option* option, Choices choices);

    /// @param words those behind the program's name; the last one is completed and may be ""
    /// @return whole words. Options before it, --adapter for one, take effect
    std::vector<std::string> complete(CLI::App& program, std::vector<std::string> words) const;

private:
    std::vector<std::string> choicesOf(const CLI::Option* option,
                                       const std::vector<std::string>& before) const;

    std::map<const CLI::Option*, Choices> m_choices;
};

} // namespace Kesbt

#endif
